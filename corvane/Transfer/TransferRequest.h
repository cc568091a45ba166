#pragma once

#include <string>
#include <utility>
#include <vector>

namespace corvane {

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
