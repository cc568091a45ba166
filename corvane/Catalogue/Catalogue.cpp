#include <corvane/Catalogue/Catalogue.h>

#include <corvane/Catalogue/CatalogueNames.h>
#include <corvane/Catalogue/CataloguePage.h>
#include <corvane/Catalogue/SchemaTree.h>
#include <corvane/Platform/Error.h>
#include <corvane/Platform/JSONText.h>
#include <corvane/Platform/PrivateFile.h>

#include <optional>
#include <system_error>
#include <vector>

namespace corvane::catalogue {

namespace {

namespace fs = std::filesystem;

// A file is for those whom its directory is for; others than its owner's group never write it.
void shareLikeDirectory(const fs::path& file) {
    std::error_code error;
    const fs::perms shared = fs::status(file.parent_path(), error).permissions() & fs::perms(0664);
    if (!error) fs::permissions(file, shared | fs::perms::owner_read | fs::perms::owner_write, error);
    if (error) throw SystemError("set the permissions of " + file.string(), error.value());
}

bool isThere(const fs::path& file) {
    std::error_code error;
    const bool does = fs::exists(fs::symlink_status(file, error));
    if (error && error != std::errc::no_such_file_or_directory) {
        throw SystemError("look at " + file.string(), error.value());
    }
    return does;
}

bool replaceIfDifferent(const fs::path& file, const std::string& contents) {
    if (isThere(file) && readWholeFile(file) == contents) return false;
    replacePrivateFile(file, contents);
    shareLikeDirectory(file);
    return true;
}

// Schemas that an earlier call wrote of events that are no more.
std::vector<fs::path> abandonedSchemas(const fs::path& directory, const std::map<std::string, std::string>& files) {
    std::vector<fs::path> abandoned;
    std::error_code error;
    for (fs::directory_iterator entry(directory, error), end; !error && entry != end; entry.increment(error)) {
        const std::string name = entry->path().filename().string();
        if (!name.ends_with(schemaSuffix) || files.contains(name)) continue;
        if (std::error_code unknown; !fs::is_regular_file(entry->symlink_status(unknown))) continue;
        if (readWholeFile(entry->path()).find(writtenBy) != std::string::npos) abandoned.push_back(entry->path());
    }
    if (error) throw SystemError("read the directory " + directory.string(), error.value());
    return abandoned;
}

void removeFile(const fs::path& file) {
    std::error_code error;
    fs::remove(file, error);
    if (error) throw SystemError("remove " + file.string(), error.value());
}

}  // namespace

std::map<std::string, std::string> files(const Vocabulary& vocabulary) {
    auto files = schemaFiles(vocabulary);
    files.emplace(pageFile, page(vocabulary));
    for (const auto& [name, contents] : files) {
        if (!jsontext::isUTF8(contents)) throw InvalidArgument("a name or description in " + name + " is not UTF-8");
    }
    return files;
}

bool write(const Vocabulary& vocabulary, const fs::path& directory) {
    const auto contents = files(vocabulary);
    std::error_code error;
    fs::create_directories(directory, error);
    if (error) throw SystemError("create the directory " + directory.string(), error.value());
    removeAbandonedPartialFiles(directory);
    bool isChanged = false;
    for (const auto& [name, text] : contents) isChanged |= replaceIfDifferent(directory / name, text);
    for (const fs::path& file : abandonedSchemas(directory, contents)) {
        removeFile(file);
        isChanged = true;
    }
    return isChanged;
}

}  // namespace corvane::catalogue
