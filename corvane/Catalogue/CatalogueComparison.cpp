#include <corvane/Catalogue/CatalogueComparison.h>

#include <corvane/Catalogue/CatalogueNames.h>
#include <corvane/Catalogue/SchemaComparison.h>
#include <corvane/Models/JSONTree.h>
#include <corvane/Platform/Error.h>
#include <corvane/Platform/JSONText.h>
#include <corvane/Platform/PrivateFile.h>

#include <algorithm>
#include <map>
#include <string_view>
#include <system_error>

namespace corvane {

namespace catalogue {

namespace {

namespace fs = std::filesystem;
using boost::json::value;

/// The schemas of a catalogue by the names of events.
using Schemas = std::map<std::string, value>;

value readSchema(const fs::path& file) {
    auto schema = jsontree::parse(readWholeFile(file), jsontext::maximumDepth);
    if (schema && schema->is_object()) return *std::move(schema);
    throw InvalidArgument("the schema in " + file.string() + " is not a JSON object");
}

const value* at(const value& schema, std::initializer_list<std::string_view> path) {
    const value* found = &schema;
    for (const std::string_view key : path) {
        const auto* object = found->if_object();
        found = object ? object->if_contains({key.data(), key.size()}) : nullptr;
        if (!found) return nullptr;
    }
    return found;
}

std::string titleOf(const value& schema, const fs::path& file) {
    const value* title = at(schema, {"title"});
    if (title && title->is_string()) return {title->get_string().data(), title->get_string().size()};
    throw InvalidArgument("the schema in " + file.string() + " has no title");
}

Schemas readEvents(const fs::path& directory) {
    Schemas schemas;
    std::error_code error;
    for (fs::directory_iterator entry(directory, error), end; !error && entry != end; entry.increment(error)) {
        const std::string name = entry->path().filename().string();
        if (!name.ends_with(schemaSuffix) || name == documentSchemaFile) continue;
        value schema = readSchema(entry->path());
        std::string title = titleOf(schema, entry->path());
        schemas.emplace(std::move(title), std::move(schema));
    }
    if (error) throw SystemError("read the directory " + directory.string(), error.value());
    return schemas;
}

void compareDocuments(const value& before, const value& after, std::vector<CatalogueChange>& changes) {
    SchemaComparison comparison("user-events", before, after, changes);
    const auto compare = [&](std::initializer_list<std::string_view> place, const char* path) {
        comparison.compare(at(before, place), at(after, place), path);
    };
    compare({"properties", "metadata"}, "metadata");
    compare({"properties", "data", "properties", "session"}, "data.session");
    compare({"properties", "data", "properties", "events", "items", "properties", "metadata", "properties", "version"},
            "data.events[].metadata.version");
}

}  // namespace

}  // namespace catalogue

std::vector<CatalogueChange> compareCatalogues(const std::filesystem::path& before,
                                               const std::filesystem::path& after) {
    using namespace catalogue;
    const value oldDocument = readSchema(before / documentSchemaFile);
    const value newDocument = readSchema(after / documentSchemaFile);
    const Schemas old = readEvents(before);
    const Schemas now = readEvents(after);

    std::vector<CatalogueChange> changes;
    for (const auto& [name, schema] : old) {
        const auto found = now.find(name);
        if (found == now.end()) {
            changes.push_back({name, "", "is gone", true});
        } else {
            SchemaComparison(name, schema, found->second, changes).compare(&schema, &found->second, "");
        }
    }
    for (const auto& [name, schema] : now) {
        if (!old.contains(name)) changes.push_back({name, "", "is new", false});
    }
    std::ranges::stable_sort(changes, {}, &CatalogueChange::event);
    compareDocuments(oldDocument, newDocument, changes);
    return changes;
}

}  // namespace corvane
