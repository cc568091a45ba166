#pragma once

#include <corvane/Export.h>

#include <exception>
#include <memory>
#include <string>
#include <string_view>

namespace corvane {

/// The base of every error that the library throws or reports.
///
/// An error names its domain (the error enumeration it belongs to, such as "Corvane.JSONError"),
/// the integer code of the enumeration value, and a message that a person can act on. The concrete
/// class gives the enumeration value.
class CORVANE_EXPORT Error : public std::exception {
  public:
    Error(std::string_view domain, int code, std::string message);
    Error(const Error&) = default;
    Error& operator=(const Error&) = default;
    ~Error() override;

    /// The error enumeration, in text with static storage.
    [[nodiscard]] std::string_view domain() const noexcept { return domain_; }
    /// The enumeration value as an integer, counted from 0 in declaration order.
    [[nodiscard]] int code() const noexcept { return code_; }
    [[nodiscard]] const char* what() const noexcept override { return message_.c_str(); }

  private:
    std::string_view domain_;
    int code_;
    std::string message_;
};

/// An argument that an object cannot be made from: text that would break out of a header, a name
/// that would leave the documents directory, a number outside its range.
class CORVANE_EXPORT InvalidArgument : public Error {
  public:
    explicit InvalidArgument(std::string message);
    InvalidArgument(const InvalidArgument&) = default;
    InvalidArgument& operator=(const InvalidArgument&) = default;
    ~InvalidArgument() override;
};

/// A failure of the operating system: a file, a directory, a thread. Carries `errno`.
class CORVANE_EXPORT SystemError : public Error {
  public:
    /// @param action what was attempted, for the message: "create directory /home/me/x".
    SystemError(std::string_view action, int errorNumber);
    SystemError(const SystemError&) = default;
    SystemError& operator=(const SystemError&) = default;
    ~SystemError() override;
};

/// Any error, kept whole: what was caught is held as it was thrown, whatever its type, and can be
/// looked at, cast, or thrown again. Copies share the one error. Safe to read from any thread.
class CORVANE_EXPORT AnyError {
  public:
    /// Takes the exception that is being handled. Requires: called inside a `catch` block.
    [[nodiscard]] static AnyError current();

    template <class E>
    CORVANE_LOCAL explicit AnyError(const E& error) : AnyError(std::make_exception_ptr(error)) {}
    explicit AnyError(std::exception_ptr error);

    /// The message of a `std::exception`; a fixed text for anything else.
    [[nodiscard]] const char* what() const noexcept;

    /// The error as an `E`, or nullptr when it is of another type. Valid while this object or a
    /// copy lives.
    template <class E>
    [[nodiscard]] CORVANE_LOCAL const E* as() const noexcept {
        return dynamic_cast<const E*>(exception_);
    }

    [[noreturn]] void rethrow() const { std::rethrow_exception(pointer_); }

  private:
    std::exception_ptr pointer_;
    const std::exception* exception_ = nullptr;
};

}  // namespace corvane
