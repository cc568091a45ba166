#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/Error.h>

#include <optional>

namespace corvane {

/// A data event that cannot become a JSON object. Domain "Corvane.DataEventError".
class CORVANE_EXPORT DataEventError : public Error {
  public:
    enum Code {
        invalidTopLevelJson = 0,        ///< its encoding is not an object
        internalError,                  ///< an object-facing data event was put through the structured encoder
        dataNotSerializable,            ///< a value in an object-facing data event's dictionary cannot be converted
        dataArrayValueNotSerializable,  ///< an element of an array cannot be converted
        dataDictKeyNotSerializable,     ///< a key of a dictionary is not a string
        dataDictValueNotSerializable,   ///< a value of a dictionary cannot be converted
    };
    explicit DataEventError(Code code);
    DataEventError(const DataEventError&) = default;
    DataEventError& operator=(const DataEventError&) = default;
    ~DataEventError() override;

    [[nodiscard]] Code value() const noexcept { return static_cast<Code>(code()); }
    friend bool operator==(const DataEventError& a, const DataEventError& b) noexcept { return a.code() == b.code(); }
};

}  // namespace corvane
