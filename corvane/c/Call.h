#pragma once

// Internal: how the functions of the C interface take their arguments and report errors.

#include <corvane/Bridge/Models/BridgedDataEventType.h>
#include <corvane/Bridge/Models/BridgedError.h>
#include <corvane/Platform/Date.h>
#include <corvane/c/Callback.h>
#include <corvane/c/corvane.h>

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <cstring>
#include <optional>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>

namespace corvane::c {

/// Throws an error of this interface's own.
[[noreturn]] void refuse(int code, std::string message);
/// Throws an error unless waiting is allowed here.
void requireMayWait();
/// Throws an error in a child of the process that used the library first.
void requireParent();
[[nodiscard]] bool isInChild() noexcept;

void clear(corvane_error* error) noexcept;
/// The exception that is being handled; logged when the caller does not want it.
void fill(corvane_error* error) noexcept;
/// An error for the length of a callback.
[[nodiscard]] corvane_error recordOf(const BridgedError& error) noexcept;

/// Does `function`, and returns what it returns, or true; what it throws fills `error`, and false or nullptr is
/// returned.
template <class F>
auto call(corvane_error* error, F&& function) {
    using R = std::invoke_result_t<F&>;
    clear(error);
    try {
        requireParent();
        if constexpr (std::is_void_v<R>) {
            function();
            return true;
        } else {
            return function();
        }
    } catch (...) {
        fill(error);
        if constexpr (std::is_void_v<R>) {
            return false;
        } else {
            return R();
        }
    }
}

/// The same for a function that takes a callback: its context is destroyed whatever becomes of the call.
template <class F>
auto call(corvane_error* error, void* context, corvane_destroy destroy, F&& function) {
    std::optional<Context> owned;
    try {
        owned.emplace(context, destroy);
    } catch (...) {
        clear(error);
        fill(error);
        return decltype(call(error, [&] { return function(*owned); }))();
    }
    return call(error, [&] { return function(std::move(*owned)); });
}

/// A text that is needed. Throws when it is missing or not UTF-8.
/// @param what for the message: "the event's name"
[[nodiscard]] std::string text(const char* given, const char* what);
/// The same; empty when it is missing.
[[nodiscard]] std::string optionalText(const char* given, const char* what);
/// Throws when no `Date` can hold the time.
[[nodiscard]] Date date(corvane_time time);
/// How pushed data behaves. Throws for a trait that is unknown.
[[nodiscard]] BridgedDataEventTraits traitsOf(std::uint32_t traits);
/// A length of time; throws for a negative one.
/// @return nothing for zero
[[nodiscard]] std::optional<std::chrono::milliseconds> duration(std::int64_t milliseconds, const char* what);

void requireSize(std::size_t size, std::size_t known, const char* what);
void requireNoMore(const char* begin, const char* end, const char* what);

/// What a structure of the host's says, whatever version of it the host was compiled with; zero for nullptr. Throws for
/// one that is too short, and for one that says what this version does not know.
/// @param what for the message: "the options"
template <class S>
[[nodiscard]] S read(const S* given, const char* what) {
    S known{};
    known.size = sizeof known;
    if (!given) return known;
    requireSize(given->size, sizeof known, what);
    const auto* bytes = reinterpret_cast<const char*>(given);
    requireNoMore(bytes + sizeof known, bytes + given->size, what);
    std::memcpy(&known, given, sizeof known);
    return known;
}

/// Fills a structure of the host's, whatever version of it the host was compiled with.
template <class S>
void write(S* given, S value, const char* what) {
    if (!given) refuse(CORVANE_NO_OBJECT, std::string("a null pointer stands where there must be ") + what);
    requireSize(given->size, sizeof value, what);
    value.size = given->size;
    auto* bytes = reinterpret_cast<char*>(given);
    std::fill(bytes + sizeof value, bytes + value.size, '\0');
    std::memcpy(given, &value, sizeof value);
}

}  // namespace corvane::c
