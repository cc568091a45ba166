#pragma once

#include <corvane/Export.h>

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

/// One upload destination, for hosts that compute it. Most hosts use `Endpoint`.
///
/// The library reads the members once, when a processor is made from the endpoint, and checks them as `Endpoint`'s
/// constructor does; what they answer later has no effect. An implementation may throw: whoever makes the processor
/// gets the error.
class CORVANE_EXPORT EndpointType {
  public:
    virtual ~EndpointType() = default;

    /// The absolute URL, http or https, that documents are PUT to.
    [[nodiscard]] virtual std::string url() const = 0;
    /// The text that keys the destination's database, payload directory and transfers. Two destinations of one
    /// application need two names; surrounding white space and the capitals A to Z do not tell them apart, but those of
    /// other letters do: see `DocumentsDirectory::fileNamePart`.
    [[nodiscard]] virtual std::string name() const = 0;
    /// The storage that an application shares with its extensions, or nothing.
    [[nodiscard]] virtual std::optional<std::string> sharedContainerIdentifier() const = 0;
    /// See `EndpointOptions`; nothing unless it is overridden.
    [[nodiscard]] virtual std::filesystem::path trustedCertificates() const { return {}; }
    [[nodiscard]] virtual std::function<HTTPHeaders()> headers() const { return {}; }

  protected:
    EndpointType() = default;
    EndpointType(const EndpointType&) = default;
    EndpointType& operator=(const EndpointType&) = default;
};

/// One upload destination: where documents go, and the name that keys what is kept for it on disk. A value, fixed at
/// construction; copies may be read from any thread.
///
///     Endpoint endpoint{"https://collector.example.com/events", "main"};
class CORVANE_EXPORT Endpoint final : public EndpointType {
  public:
    /// Throws `InvalidArgument` when the URL is not an absolute one of the scheme http or https or holds blanks or
    /// control characters (it would break out of the request line), when the name cannot be a part of a file name (see
    /// `DocumentsDirectory::fileNamePart`), and when the certificates' path is not absolute. A user and a password in
    /// the URL are sent, and printed nowhere.
    Endpoint(std::string url, std::string name, std::optional<std::string> sharedContainerIdentifier = std::nullopt);
    Endpoint(std::string url, std::string name, EndpointOptions options);

    /// Reads a host's own endpoint, once. Throws as above, and what the members of `other` throw.
    [[nodiscard]] static Endpoint copyOf(const EndpointType& other);

    ~Endpoint() override;
    Endpoint(const Endpoint&) = default;
    Endpoint& operator=(const Endpoint&) = default;

    [[nodiscard]] std::string url() const override { return url_; }
    [[nodiscard]] std::string name() const override { return name_; }
    [[nodiscard]] std::optional<std::string> sharedContainerIdentifier() const override {
        return options_.sharedContainerIdentifier;
    }
    [[nodiscard]] std::filesystem::path trustedCertificates() const override { return options_.trustedCertificates; }
    [[nodiscard]] std::function<HTTPHeaders()> headers() const override { return options_.headers; }

  private:
    std::string url_;
    std::string name_;
    EndpointOptions options_;
};

}  // namespace corvane
