#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/Bundle.h>

#include <cstdint>
#include <optional>
#include <string>

namespace corvane {

/// The application that sends. A value; may be read from any thread.
class CORVANE_EXPORT Client {
  public:
    /// @param identifier the application's bundle identifier, such as "com.example.player"
    /// @param name its name for people
    /// @param version its marketing version, such as "2.3"
    /// @param build its build number
    /// Throws `InvalidArgument` when a text holds a control character: identifier and version go into a header.
    Client(std::string identifier, std::string name, std::string version, std::int64_t build);

    /// The running application's own metadata; nothing, and a line in the log, when the bundle lacks its identifier,
    /// name, short version or version. A build version counts up to its first "."; 0 when that is not a number.
    [[nodiscard]] static std::optional<Client> fromBundle(const Bundle& bundle = Bundle::main());

    [[nodiscard]] const std::string& identifier() const { return identifier_; }
    [[nodiscard]] const std::string& name() const { return name_; }
    [[nodiscard]] const std::string& version() const { return version_; }
    [[nodiscard]] std::int64_t build() const { return build_; }

    /// Version and build: "2.3.117".
    [[nodiscard]] std::string fullVersion() const;

  private:
    std::string identifier_;
    std::string name_;
    std::string version_;
    std::int64_t build_;
};

}  // namespace corvane
