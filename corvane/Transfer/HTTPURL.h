#pragma once

#include <string>

namespace corvane {

/// What an HTTP transfer has to know of its URL. A value. Internal.
struct HTTPURL {
    std::string host;  ///< in lower case
    std::string port;

    /// Throws `TransferError` for a URL that cannot be used, or that is neither http nor https.
    [[nodiscard]] static HTTPURL parse(const std::string& text);

    /// "example.com:443".
    [[nodiscard]] std::string server() const { return host + ':' + port; }
    /// Whether the host is this machine, to which no proxy leads.
    [[nodiscard]] bool isLoopback() const;
};

/// ASCII letters only.
[[nodiscard]] std::string inLowerCase(std::string text);

}  // namespace corvane
