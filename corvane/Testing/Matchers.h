#pragma once

#include <corvane/Testing/RecordedEvent.h>

#include <gmock/gmock.h>

#include <cstdint>
#include <optional>
#include <string>

// GoogleMock matchers for what a `RecordingProcessor` has kept. The one header that needs GoogleMock, which the test
// program brings and links.
//
//     EXPECT_THAT(recording->events(), ElementsAre(IsEvent("Opened"), IsEvent("ScreenView", HasField("screen.name",
//     "home"))));
//     EXPECT_THAT(recording->only("Played"), HasInteger("span.duration", Ge(1000)));

namespace corvane::test {

namespace detail {

template <class Value, class Inner>
auto hasValue(const std::string& path, std::optional<Value> (JSON::*view)() const, const Inner& inner) {
    return ::testing::ResultOf(
        "what is at " + path, [path, view](const ProcessEvent& event) { return (valueAt(event.json(), path).*view)(); },
        ::testing::Optional(inner));
}

}  // namespace detail

/// An event of this name that every one of the other matchers matches.
template <class... Fields>
[[nodiscard]] auto IsEvent(const std::string& name, const Fields&... fields) {
    return ::testing::AllOf(::testing::Property("name", &ProcessEvent::name, name), fields...);
}

/// An event that has this value at a path (see `valueAt`), compared as `FieldValue` does.
MATCHER_P2(HasField, path, value,
           std::string(negation ? "has not " : "has ") + path + " = " + FieldValue(value).text()) {
    return FieldValue(value).equals(valueAt(arg.json(), path));
}

/// An event with text at a path that the inner matcher (of `std::string`) matches. The next ones do the same for
/// numbers and booleans; a field of another kind matches none of them.
/// @{
template <class Inner>
[[nodiscard]] auto HasText(const std::string& path, const Inner& inner) {
    return detail::hasValue(path, &JSON::string, inner);
}
template <class Inner>
[[nodiscard]] auto HasInteger(const std::string& path, const Inner& inner) {
    return detail::hasValue(path, &JSON::integer, inner);
}
template <class Inner>
[[nodiscard]] auto HasNumber(const std::string& path, const Inner& inner) {
    return detail::hasValue(path, &JSON::double_, inner);
}
template <class Inner>
[[nodiscard]] auto HasFlag(const std::string& path, const Inner& inner) {
    return detail::hasValue(path, &JSON::bool_, inner);
}
/// @}

}  // namespace corvane::test
