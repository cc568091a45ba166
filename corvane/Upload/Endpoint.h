#pragma once

#include <corvane/Export.h>
#include <corvane/Upload/EndpointType.h>

#include <optional>
#include <string>

namespace corvane {

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
