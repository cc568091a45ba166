#pragma once

#include <corvane/Platform/Date.h>
#include <corvane/Upload/UploadResponse.h>

#include <chrono>
#include <optional>

namespace corvane {

/// No server holds uploads back for longer than this at a time.
inline constexpr std::chrono::seconds longestRetryAfter = std::chrono::hours(24);

/// How long an answer of status 429 or 503 asks to be left alone for: its Retry-After, as a number of seconds or a
/// date, and at most `longestRetryAfter`. Nothing for other answers, without that header, or when it says neither or a
/// date that has passed. Internal.
/// @param now when the answer came, by the wall clock
[[nodiscard]] std::optional<std::chrono::seconds> retryAfter(const UploadResponse& response, Date now);

}  // namespace corvane
