#pragma once

#include "Schema.h"

#include <corvane/Models/JSON.h>

#include <filesystem>
#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace collector {

/// The schemas of a catalogue, read from the directory that it was written to, for documents to be held against.
/// Safe from any thread once it is made.
class SchemaFolder {
  public:
    /// Reads all that "user-events.schema.json" refers to. Throws `std::runtime_error`, which names the file and what
    /// is wrong with it, when one is missing or says something that is not understood here: what is not checked must
    /// not look as if it were.
    explicit SchemaFolder(const std::filesystem::path& directory);

    /// A line for each event that does not match, with its place, its name and what is wrong; one, too, for the rest
    /// of the document. At most 20, and one that counts the others.
    struct Report {
        std::size_t mismatches = 0;  ///< how many events, and the rest as one
        std::vector<std::string> lines;
    };
    [[nodiscard]] Report check(const corvane::JSON& document) const;

  private:
    const Schema* schemaAt(const std::string& file, const std::string& pointer);
    const corvane::JSON& contentsOf(const std::string& file);
    void read(const corvane::JSON& json, const std::string& file, Schema& schema);
    void readKeyword(const std::string& keyword, const corvane::JSON& json, const std::string& file, Schema& schema);
    const Schema* resolve(const std::string& reference, const std::string& file);

    const std::filesystem::path directory_;
    std::map<std::string, corvane::JSON> files_;
    std::map<std::string, std::unique_ptr<Schema>> schemas_;  // by file and pointer
    const Schema* document_ = nullptr;
};

}  // namespace collector
