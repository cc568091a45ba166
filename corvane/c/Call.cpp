#include <corvane/c/Call.h>

#include <corvane/Bridge/Models/Refusal.h>
#include <corvane/Platform/ForkMark.h>
#include <corvane/Platform/Log.h>

#include <cstddef>
#include <new>

namespace corvane::c {

namespace {

constexpr const char* domain = "Corvane.CError";

void copy(char* out, std::size_t capacity, std::string_view text) noexcept {
    if (text.size() >= capacity) {
        text = text.substr(0, capacity - 1);
        // Not in the midst of a character.
        while (!text.empty() && !jsontext::isUTF8(text) && text.size() + 4 > capacity) text.remove_suffix(1);
    }
    std::memcpy(out, text.data(), text.size());
    out[text.size()] = '\0';
}

void fillWith(corvane_error& error, const BridgedError& from) noexcept {
    error.code = from.code();
    copy(error.domain, sizeof error.domain, from.domain());
    copy(error.message, sizeof error.message, from.what());
}

}  // namespace

void refuse(int code, std::string message) {
    throw BridgedError(domain, code, std::move(message));
}

void requireMayWait() {
    if (Entered::forbidsWaiting()) refuse(CORVANE_WOULD_WAIT, "a callback must not wait for the library");
}

bool isInChild() noexcept {
    static const ForkMark firstUse;
    return firstUse.isInChild();
}

void requireParent() {
    if (isInChild()) refuse(CORVANE_FORKED, "the process was forked after it had used the library");
}

void clear(corvane_error* error) noexcept {
    if (!error || error->size < sizeof *error) return;
    error->code = 0;
    error->domain[0] = error->message[0] = '\0';
}

void fill(corvane_error* error) noexcept {
    const bool isWanted = error && error->size >= sizeof *error;
    try {
        const BridgedError from = BridgedError::of(AnyError::current());
        if (isWanted) return fillWith(*error, from);
        // Nobody else would hear of it.
        Log::shared().error("A call has failed, error=%{public}@", from.what());
    } catch (const std::bad_alloc&) {  // of the error itself
        if (isWanted) {
            copy(error->domain, sizeof error->domain, "Corvane.HostError");
            copy(error->message, sizeof error->message, "there is no memory");
        }
    }
}

corvane_error recordOf(const BridgedError& error) noexcept {
    corvane_error record = CORVANE_ERROR_INIT;
    fillWith(record, error);
    return record;
}

std::string text(const char* given, const char* what) {
    if (!given) refuse(CORVANE_NO_OBJECT, std::string("a null pointer stands where a text is needed: ") + what);
    bridge::requireUTF8(given, what);
    return given;
}

std::string optionalText(const char* given, const char* what) {
    return given ? text(given, what) : std::string();
}

Date date(corvane_time time) {
    const auto found = dateFromMilliseconds(time);
    if (!found) refuse(CORVANE_INVALID_ARGUMENT, "a time lies beyond what a date can hold");
    return *found;
}

BridgedDataEventTraits traitsOf(std::uint32_t traits) {
    constexpr std::uint32_t known = CORVANE_ONLY_ONCE | CORVANE_UNIQUE;
    if ((traits & ~known) != 0) refuse(CORVANE_INVALID_ARGUMENT, "a trait of the data is unknown");
    return {.onlyOnce = (traits & CORVANE_ONLY_ONCE) != 0, .unique = (traits & CORVANE_UNIQUE) != 0};
}

std::optional<std::chrono::milliseconds> duration(std::int64_t milliseconds, const char* what) {
    if (milliseconds < 0) refuse(CORVANE_INVALID_ARGUMENT, std::string(what) + " is negative");
    if (milliseconds == 0) return std::nullopt;
    return std::chrono::milliseconds(milliseconds);
}

void requireSize(std::size_t size, std::size_t known, const char* what) {
    if (size < known) refuse(CORVANE_INVALID_ARGUMENT, std::string("the size is not set, or too small, of ") + what);
    if (size > std::size_t{64} * 1024) refuse(CORVANE_INVALID_ARGUMENT, std::string("the size is not set of ") + what);
}

void requireNoMore(const char* begin, const char* end, const char* what) {
    if (std::all_of(begin, end, [](char byte) { return byte == 0; })) return;
    refuse(CORVANE_INVALID_ARGUMENT,
           std::string("this version of the library does not know all that is set in ") + what);
}

}  // namespace corvane::c
