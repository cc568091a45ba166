#include <corvane/Upload/UploadDropbox.h>

#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Platform/Error.h>
#include <corvane/Platform/PrivateFile.h>
#include <corvane/Platform/UUID.h>
#include <corvane/Store/StoreConnection.h>
#include <corvane/Upload/ResourceType.h>
#include <corvane/Upload/UploadResponse.h>

#include <unistd.h>

#include <cerrno>
#include <chrono>

namespace corvane {

namespace {

std::filesystem::path directory(const std::string& name, std::string_view suffix) {
    const auto part = DocumentsDirectory::fileNamePart(name);
    return std::filesystem::absolute(DocumentsDirectory::path() / ("com.veskar.corvane." + part).append(suffix));
}

bool canNameFile(std::string_view identifier) {
    return !identifier.empty() && identifier != "." && identifier != ".." &&
           identifier.find_first_of(std::string_view("/\0", 2)) == std::string_view::npos;
}

std::filesystem::path file(const std::filesystem::path& directory, std::string_view identifier,
                           std::string_view extension = {}) {
    if (!canNameFile(identifier)) throw InvalidArgument("an upload's identifier must be able to name a file");
    return directory / std::string(identifier).append(extension);
}

void writeCopy(const UploadDropbox::Debugging& debugging, std::string_view identifier, std::string_view extension,
               std::string_view text) {
    createPrivateDirectories(*debugging.baseURL());
    replacePrivateFile(file(*debugging.baseURL(), identifier, extension), text);
}

}  // namespace

UploadDropbox::UploadDropbox(const std::string& name, bool debugging)
    : baseURL_([name] { return directory(name, ".upload-dropbox"); }), debugging_([name, debugging] {
          return debugging ? Debugging::enabled(directory(name, ".upload-dropbox.debugging")) : Debugging::none();
      }) {}

UploadDropbox::~UploadDropbox() = default;

std::filesystem::path UploadDropbox::directoryBeside(const StoreConnection& database) {
    return std::filesystem::path(database.file()).replace_extension(".upload-dropbox");
}

void UploadDropbox::remove(const std::filesystem::path& directory, std::string_view identifier) {
    if (!canNameFile(identifier)) return;
    const auto payload = file(directory, identifier);
    if (::unlink(payload.c_str()) != 0 && errno != ENOENT) throw SystemError("remove file " + payload.string(), errno);
}

std::filesystem::path UploadDropbox::write(std::string_view identifier, std::string_view data,
                                           const ResourceType& resource) {
    auto payload = file(baseURL(), identifier);
    createPrivateDirectories(baseURL());
    std::call_once(tidied_, [this] {
        removeAbandonedPartialFiles(baseURL());
        if (debugging().baseURL()) removeAbandonedPartialFiles(*debugging().baseURL());
    });
    replacePrivateFile(payload, data);
    try {
        if (debugging().baseURL()) writeCopy(debugging(), identifier, ".request.json", resource.jsonObject().toData());
    } catch (...) {
        ::unlink(payload.c_str());  // the document is refused, and the next attempt has a name of its own
        throw;
    }
    return payload;
}

void UploadDropbox::sync(std::string_view identifier) {
    const auto payload = file(baseURL(), identifier);
    try {
        syncFile(payload);
    } catch (...) {
        ::unlink(payload.c_str());  // what a disk has lost once it may have lost for good
        throw;
    }
}

void UploadDropbox::finish(std::string_view identifier, const std::optional<UploadResponse>& response) {
    const auto payload = file(baseURL(), identifier);
    if (::unlink(payload.c_str()) != 0) throw SystemError("remove file " + payload.string(), errno);
    if (response && debugging().baseURL()) writeCopy(debugging(), identifier, ".response.json", response->jsonText());
}

std::vector<std::string> UploadDropbox::abandonedPayloads(const std::set<std::string>& recorded) {
    std::vector<std::string> abandoned;
    const auto oldest = std::filesystem::file_time_type::clock::now() - std::chrono::hours(1);
    std::error_code failed;
    for (std::filesystem::directory_iterator entry(baseURL(), failed), end; !failed && entry != end;
         entry.increment(failed)) {
        auto name = entry->path().filename().string();
        if (!isUUID(name) || recorded.contains(name)) continue;
        std::error_code unseen;
        if (entry->last_write_time(unseen) < oldest && !unseen) abandoned.push_back(std::move(name));
    }
    return abandoned;
}

std::optional<std::filesystem::path> UploadDropbox::existingFile(std::string_view identifier) {
    if (!canNameFile(identifier)) return std::nullopt;
    auto payload = file(baseURL(), identifier);
    std::error_code ignored;
    if (!std::filesystem::is_regular_file(payload, ignored)) return std::nullopt;
    return payload;
}

}  // namespace corvane
