#pragma once

#include <filesystem>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

namespace corvane {

class ResourceType;
struct UploadResponse;

/// Holds one payload file per pending upload. The upload manager writes and removes the files, the transfer reads them,
/// so all operations may be called from any thread.
class UploadDropboxType {
  public:
    virtual ~UploadDropboxType() = default;

    /// Keeps `data` as the payload of the upload `identifier`, in place of an earlier one, and returns its file.
    /// `resource` is what the data was made from. Throws when the file cannot be written.
    virtual std::filesystem::path write(std::string_view identifier, std::string_view data,
                                        const ResourceType& resource) = 0;

    /// Waits until the payload survives a power cut. Throws when that cannot be had; the payload is gone then. Does
    /// nothing where payloads are in no files, as here.
    virtual void sync(std::string_view /*identifier*/) {}

    /// Removes the payload of an upload that is over; `response` is what the collector answered, nothing when it was
    /// given up. Throws when there is no such file or it cannot be removed.
    virtual void finish(std::string_view identifier, const std::optional<UploadResponse>& response) = 0;

    /// The identifiers of the payloads that are older than an hour and not among `recorded`: what a process that was
    /// killed may have left. A dropbox that cannot tell names none, which is what happens here.
    [[nodiscard]] virtual std::vector<std::string> abandonedPayloads(const std::set<std::string>& /*recorded*/) {
        return {};
    }

    /// Where the payloads are, whether it exists or not; empty where they are in no directory, as here.
    [[nodiscard]] virtual std::filesystem::path payloadDirectory() { return {}; }

    /// The payload file of an upload, if there is one.
    [[nodiscard]] virtual std::optional<std::filesystem::path> existingFile(std::string_view identifier) = 0;
};

}  // namespace corvane
