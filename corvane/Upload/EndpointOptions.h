#pragma once

#include <filesystem>
#include <functional>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace corvane {

/// What an endpoint has beside its URL and its name. A value.
///
///     Endpoint endpoint{"https://collector.example.com/events", "main",
///                       {.headers = [] { return HTTPHeaders{{"Authorization", "Bearer " + token()}}; }}};
struct EndpointOptions {
    /// Names and values, sent in this order.
    using HTTPHeaders = std::vector<std::pair<std::string, std::string>>;

    /// The storage that an application shares with its extensions, or nothing.
    std::optional<std::string> sharedContainerIdentifier = {};

    /// The authorities that the server's certificate may come from: a file in PEM, or a directory as OpenSSL's `rehash`
    /// makes one, by its absolute path. It takes the place of the system's. Empty: the system's. It is read whenever a
    /// connection is made; one that cannot be read is an error in the log, and documents wait until it can.
    std::filesystem::path trustedCertificates = {};

    /// Asked for further headers whenever a document is handed over, as for an authorisation token: on a queue of the
    /// library's, at most two calls at a time. It must not wait. They are sent behind the library's own, and never in
    /// their place: one that has the name of one of those, or of what the transfer itself says (the body's length and
    /// coding, the host, the connection), or that is no header, is left out, and an error is logged; so is what the
    /// call throws, and the document goes out without. A document that is sent again asks again.
    ///
    /// What is handed over lies on disk until the document is through, in the transfer agent's spool and journal
    /// (mode 0600), headers included.
    std::function<HTTPHeaders()> headers = {};
};

using HTTPHeaders = EndpointOptions::HTTPHeaders;

}  // namespace corvane
