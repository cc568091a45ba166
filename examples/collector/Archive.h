#pragma once

#include "Document.h"

#include <cstdint>
#include <filesystem>
#include <fstream>
#include <string>
#include <unordered_set>

namespace collector {

/// Keeps documents, one a line, in the file "documents.ndjson" of a directory, and knows which documents and events it
/// has: senders deliver at least once, so the same may come again. Belongs to one thread at a time.
class Archive {
  public:
    struct Counts {
        std::int64_t documents = 0;
        std::int64_t duplicateDocuments = 0;
        std::int64_t events = 0;  ///< distinct ones; an event without an identifier is distinct
        std::int64_t duplicateEvents = 0;
    };

    /// Makes the directory if it is missing and reads what an earlier run left there, which counts as seen.
    /// Throws `std::exception`.
    explicit Archive(const std::filesystem::path& directory);

    /// Writes a document, unless it is known; returns what is new in it. Throws `Refusal` (500) when it cannot be
    /// written.
    Counts add(const Document& document);

    /// Everything that was added in this run.
    [[nodiscard]] const Counts& counts() const { return counts_; }

  private:
    void readEarlier();
    void write(const std::string& line);

    const std::filesystem::path file_;
    std::ofstream out_;
    std::uintmax_t size_ = 0;
    std::unordered_set<std::string> documents_;
    std::unordered_set<std::string> events_;
    Counts counts_;
};

}  // namespace collector
