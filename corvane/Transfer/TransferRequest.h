#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <utility>
#include <vector>

namespace corvane {

/// The head of what a server answered. A value.
struct TransferResponse {
    bool isHTTP = true;           ///< whether the other members mean anything
    std::int64_t statusCode = 0;  ///< the final status, never a 1xx one
    /// Field values by name, spelled as in the answer. A field that came more than once has its values joined by ", "
    /// under the first spelling. The bytes are the server's: they need not be UTF-8.
    std::map<std::string, std::string> headers;

    bool operator==(const TransferResponse&) const = default;
};

/// The head of an HTTP request. A value.
///
/// Nothing is checked here: a request that cannot be sent (a URL that is no URL or neither http nor https, a header
/// that would break out of its line) ends as a failed transfer.
struct TransferRequest {
    std::string url;
    std::string method = "PUT";
    /// Names and values, sent in this order. "Content-Length" is the transfer's own affair.
    std::vector<std::pair<std::string, std::string>> headers;

    bool operator==(const TransferRequest&) const = default;
};

}  // namespace corvane
