#pragma once

#include "Archive.h"
#include "Hub.h"
#include "SchemaFolder.h"
#include "SignatureVerifier.h"
#include "Upload.h"

#include <cstdint>
#include <filesystem>
#include <mutex>
#include <optional>

namespace collector {

/// Judges uploads, keeps the good ones, and prints a line for each. Safe from any thread.
class Collector {
  public:
    /// @param publicKeyFile the key to verify signatures with; nothing to leave them unverified
    /// @param schemas the directory of schemas to hold documents against; nothing to take whatever is in them
    Collector(const std::filesystem::path& directory, const std::optional<std::filesystem::path>& publicKeyFile,
              const std::optional<std::filesystem::path>& schemas);

    /// Never throws: what is wrong with an upload is in the answer.
    [[nodiscard]] Answer receive(const Upload& upload) noexcept;
    /// Counts a request that was turned away before it was an upload.
    Answer refuse(int status, const char* reason);

    void printTotals();

    /// Where everything that is received or refused is told.
    [[nodiscard]] Hub& hub() { return hub_; }

  private:
    Answer accept(const Upload& upload);
    void print(const SchemaFolder::Report& report);

    std::optional<SignatureVerifier> verifier_;
    std::optional<SchemaFolder> schemas_;
    Hub hub_;
    std::mutex mutex_;
    // Guarded by mutex_, as is standard output.
    Archive archive_;
    std::int64_t refused_ = 0;
    std::int64_t mismatches_ = 0;
};

}  // namespace collector
