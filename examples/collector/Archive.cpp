#include "Archive.h"

#include "Refusal.h"

#include <cerrno>
#include <stdexcept>
#include <system_error>
#include <utility>

namespace collector {

Archive::Archive(const std::filesystem::path& directory) : file_(directory / "documents.ndjson") {
    std::filesystem::create_directories(directory);
    readEarlier();
    out_.open(file_, std::ios::binary | std::ios::app);
    if (!out_) throw std::system_error(errno, std::generic_category(), file_.string());
    size_ = std::filesystem::file_size(file_);
}

void Archive::readEarlier() {
    std::ifstream in(file_, std::ios::binary);
    for (std::string line; std::getline(in, line);) {
        try {
            const Document document = readDocument(std::move(line));
            documents_.insert(document.identifier);
            events_.insert(document.eventIDs.begin(), document.eventIDs.end());
        } catch (const Refusal& refusal) {
            throw std::runtime_error(file_.string() + " is not of this program: " + refusal.what());
        }
    }
}

Archive::Counts Archive::add(const Document& document) {
    Counts added;
    if (documents_.contains(document.identifier)) {
        added.duplicateDocuments = 1;
        added.duplicateEvents = static_cast<std::int64_t>(document.events);
    } else {
        write(document.line);
        documents_.insert(document.identifier);
        added.documents = 1;
        for (const std::string& identifier : document.eventIDs)
            added.duplicateEvents += !events_.insert(identifier).second;
        added.events = static_cast<std::int64_t>(document.events) - added.duplicateEvents;
    }
    counts_.documents += added.documents;
    counts_.duplicateDocuments += added.duplicateDocuments;
    counts_.events += added.events;
    counts_.duplicateEvents += added.duplicateEvents;
    return added;
}

void Archive::write(const std::string& line) {
    out_ << line << '\n' << std::flush;
    if (out_) {
        size_ += line.size() + 1;
        return;
    }
    // A part of the line may be in the file: the next document must not be joined to it.
    out_.clear();
    std::error_code ignored;
    std::filesystem::resize_file(file_, size_, ignored);
    throw Refusal(500, "the document cannot be kept");
}

}  // namespace collector
