#pragma once

#include <corvane/Platform/Lazy.h>
#include <corvane/Upload/UploadDropboxType.h>

#include <filesystem>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

namespace corvane {

class StoreConnection;

/// The payload directory of one endpoint, in the documents directory, and with debugging its twin with readable copies
/// of what was sent and answered, which the library never removes.
///
/// Directories are looked up on first use and made when something is written, 0700; files are 0600 and never half
/// written; what a killed process left of one is removed with the first `write`, once it is an hour old. Identifiers
/// are file names: one that is empty, a relative step, or holds a slash or NUL is refused with `InvalidArgument`.
/// Failures of the file system are `SystemError`. Safe from any thread.
class UploadDropbox final : public UploadDropboxType {
  public:
    /// Whether, and where, debugging copies are kept.
    class Debugging {
      public:
        [[nodiscard]] static Debugging enabled(std::filesystem::path baseURL) { return Debugging(std::move(baseURL)); }
        [[nodiscard]] static Debugging none() { return Debugging(std::nullopt); }

        /// The directory of the copies; nothing when there are none.
        [[nodiscard]] const std::optional<std::filesystem::path>& baseURL() const noexcept { return baseURL_; }

      private:
        explicit Debugging(std::optional<std::filesystem::path> baseURL) : baseURL_(std::move(baseURL)) {}

        std::optional<std::filesystem::path> baseURL_;
    };

    /// @param name the endpoint's name.
    explicit UploadDropbox(const std::string& name, bool debugging = false);
    ~UploadDropbox() override;

    /// The payload directory of the endpoint whose database that is. Requires: the database is a file.
    [[nodiscard]] static std::filesystem::path directoryBeside(const StoreConnection& database);
    /// Removes the payload of an upload from such a directory, if it is there. Throws `SystemError`.
    static void remove(const std::filesystem::path& directory, std::string_view identifier);

    /// The payload directory, whether it exists or not. Throws `InvalidArgument` for a name that cannot name one.
    [[nodiscard]] const std::filesystem::path& baseURL() const { return baseURL_.value(); }
    [[nodiscard]] const Debugging& debugging() const { return debugging_.value(); }

    /// With debugging, a copy of the document that cannot be written is an error too, and leaves no payload.
    std::filesystem::path write(std::string_view identifier, std::string_view data,
                                const ResourceType& resource) override;
    void sync(std::string_view identifier) override;
    void finish(std::string_view identifier, const std::optional<UploadResponse>& response) override;
    /// Of names that are UUIDs, as those of the library's own documents are: anything else may be somebody else's file.
    [[nodiscard]] std::vector<std::string> abandonedPayloads(const std::set<std::string>& recorded) override;
    [[nodiscard]] std::filesystem::path payloadDirectory() override { return baseURL(); }
    /// A name that cannot be a payload's has no file.
    [[nodiscard]] std::optional<std::filesystem::path> existingFile(std::string_view identifier) override;

  private:
    const Lazy<std::filesystem::path> baseURL_;
    const Lazy<Debugging> debugging_;
    std::once_flag tidied_;
};

}  // namespace corvane
