#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/Error.h>

#include <exception>
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

/// An error as object-facing callers see it: a domain, a code and a message, whatever class it had inside the library.
/// Completions get one, out-arguments are filled with one, and host code that reports a failure of its own makes one.
/// A value; it can be thrown too.
///
///     BridgedError error;
///     if (!tracker.pushDataEvent(data, {}, &error)) report(error.domain(), error.code(), error.what());
class CORVANE_EXPORT BridgedError : public std::exception {
  public:
    /// No error: an empty domain, the code 0 and no message.
    BridgedError();
    BridgedError(std::string domain, int code, std::string message);
    BridgedError(const BridgedError&) = default;
    BridgedError(BridgedError&&) = default;
    BridgedError& operator=(const BridgedError&) = default;
    BridgedError& operator=(BridgedError&&) = default;
    ~BridgedError() override;

    /// What was thrown as it looks from outside. The library's errors keep domain and code, and so does a
    /// `BridgedError`; any other exception is of the domain "Corvane.HostError", code 0.
    [[nodiscard]] static BridgedError of(const AnyError& error);

    /// The error enumeration, such as "Corvane.TrackerError".
    [[nodiscard]] const std::string& domain() const noexcept { return domain_; }
    /// The value of the enumeration.
    [[nodiscard]] int code() const noexcept { return code_; }
    [[nodiscard]] const char* what() const noexcept override { return message_.c_str(); }

  private:
    std::string domain_;
    int code_ = 0;
    std::string message_;
};

}  // namespace corvane
