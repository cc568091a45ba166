#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/Error.h>

#include <string>

namespace corvane {

/// What an object-facing caller handed over cannot be used. The message says which part. Domain "Corvane.BridgeError";
/// the codes may not change.
class CORVANE_EXPORT BridgeError : public Error {
  public:
    enum Code {
        missingObject = 0,  ///< nullptr, or an empty function, where an object is needed
        notUTF8,            ///< a name that is not UTF-8
        unknownValue,       ///< an integer that is no value of its enumeration
        repeatedProperty,   ///< two properties of an event have one name
        wrongQueue,         ///< a handle was used off its queue, or after the block that it was given to
    };
    /// @param what which argument, for the message: "the event's name"
    BridgeError(Code code, std::string what);
    BridgeError(const BridgeError&) = default;
    BridgeError& operator=(const BridgeError&) = default;
    ~BridgeError() override;

    [[nodiscard]] Code value() const noexcept { return static_cast<Code>(code()); }
};

}  // namespace corvane
