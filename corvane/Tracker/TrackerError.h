#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/Error.h>
#include <corvane/Reflection/DataType.h>

#include <string>
#include <vector>

namespace corvane {

/// Why an event was not recorded. Domain "Corvane.TrackerError".
class CORVANE_EXPORT TrackerError : public Error {
  public:
    enum Code {
        eventMissingData = 0,  ///< required properties have no data: push it, or declare them optional
        noSession,             ///< no session is active, or the session manager is gone: start one
        notRecording,          ///< recording is off, or was when the event was submitted
    };

    struct MissingData {
        std::string key;       ///< the property's name
        DataType type;         ///< the data type that it requires
        std::string dataName;  ///< the name under which the data is pushed
        friend bool operator==(const MissingData&, const MissingData&) = default;
    };

    /// `eventMissingData` with every missing property, in declaration order.
    [[nodiscard]] static TrackerError missing(std::vector<MissingData> missingData);
    [[nodiscard]] static TrackerError withoutSession();
    [[nodiscard]] static TrackerError withoutRecording();
    TrackerError(const TrackerError&) = default;
    TrackerError& operator=(const TrackerError&) = default;
    ~TrackerError() override;

    [[nodiscard]] Code value() const noexcept { return static_cast<Code>(code()); }
    [[nodiscard]] const std::vector<MissingData>& missingData() const noexcept { return missingData_; }

    friend bool operator==(const TrackerError& a, const TrackerError& b) {
        return a.code() == b.code() && a.missingData_ == b.missingData_;
    }

  private:
    TrackerError(Code code, std::string message, std::vector<MissingData> missingData);

    std::vector<MissingData> missingData_;
};

}  // namespace corvane
