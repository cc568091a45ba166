#include <corvane/Platform/Error.h>

#include <system_error>
#include <utility>

namespace corvane {

namespace {

// A message may quote text of the host's: a NUL in it would be the end for whoever reads what().
std::string withoutNUL(std::string text) {
    for (auto at = text.find('\0'); at != std::string::npos; at = text.find('\0', at)) text.replace(at, 1, "\\x00");
    return text;
}

}  // namespace

Error::Error(std::string_view domain, int code, std::string message)
    : domain_(domain), code_(code), message_(withoutNUL(std::move(message))) {}
Error::~Error() = default;

InvalidArgument::InvalidArgument(std::string message) : Error("Corvane.InvalidArgument", 0, std::move(message)) {}
InvalidArgument::~InvalidArgument() = default;

SystemError::SystemError(std::string_view action, int errorNumber)
    : Error("Corvane.SystemError", errorNumber,
            "cannot " + std::string(action) + ": " + std::system_category().message(errorNumber)) {}
SystemError::~SystemError() = default;

AnyError AnyError::current() {
    return AnyError(std::current_exception());
}

AnyError::AnyError(std::exception_ptr error) : pointer_(std::move(error)) {
    // Rethrowing does not copy the exception object, so the address stays good as long as pointer_
    // holds it.
    try {
        std::rethrow_exception(pointer_);
    } catch (const std::exception& exception) {
        exception_ = &exception;
    } catch (...) {
    }
}

const char* AnyError::what() const noexcept {
    if (!exception_) return "an exception that is not a std::exception";
    const char* text = exception_->what();
    return text ? text : "an exception without a message";
}

}  // namespace corvane
