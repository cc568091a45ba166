#pragma once

#include <cstdint>
#include <map>
#include <string>

namespace corvane {

/// What a collector answered to one upload. A value.
struct UploadResponse {
    std::int64_t statusCode = 0;                      ///< the HTTP status code
    std::map<std::string, std::string> headers = {};  ///< field values by name, as the transfer layer spells them

    /// Compact JSON text of an object with the keys "statusCode" and "headers". Throws `EncodingError` when a header
    /// is not UTF-8.
    [[nodiscard]] std::string jsonText() const;

    /// The response as a log line prints it.
    [[nodiscard]] std::string description() const;

    bool operator==(const UploadResponse&) const = default;
};

}  // namespace corvane
