#pragma once

#include <string>
#include <string_view>

namespace corvane {

/// The proxy that a transfer goes through. A value.
///
/// Taken from the environment of the process that hands a transfer over, so that one agent serves hosts behind
/// different proxies. The URL may hold a password: it is never logged. Internal.
struct TransferProxy {
    /// Empty for none.
    std::string url;
    /// The hosts that are reached without it, as in the variable no_proxy.
    std::string exceptions;

    /// What the environment says for a URL: http_proxy for http; https_proxy or HTTPS_PROXY for https; otherwise
    /// all_proxy or ALL_PROXY; with no_proxy or NO_PROXY. A variable without a value is not there. HTTP_PROXY is never
    /// looked at: whoever sends a request to a CGI program sets it.
    [[nodiscard]] static TransferProxy ofEnvironment(std::string_view url);

    bool operator==(const TransferProxy&) const = default;
};

}  // namespace corvane
