#pragma once

#include <corvane/Export.h>
#include <corvane/Upload/EndpointOptions.h>

#include <filesystem>
#include <functional>
#include <optional>
#include <string>

namespace corvane {

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

}  // namespace corvane
