#include "SchemaFolder.h"

#include <corvane/Platform/JSONText.h>

#include <charconv>
#include <fstream>
#include <functional>
#include <iterator>
#include <set>
#include <stdexcept>
#include <utility>

namespace collector {

namespace {

using corvane::JSON;

constexpr auto documentFile = "user-events.schema.json";
constexpr std::size_t mostLines = 20;

[[noreturn]] void fail(const std::string& file, const std::string& reason) {
    throw std::runtime_error("the schema in " + file + " cannot be used: " + reason);
}

/// What a keyword must be, as one of JSON's optional views.
template <class T>
T require(std::optional<T> value, const std::string& keyword, const std::string& file) {
    if (!value) fail(file, "\"" + keyword + "\" is not of the right type");
    return *std::move(value);
}

std::vector<std::string> strings(const JSON& json, const std::string& keyword, const std::string& file) {
    std::vector<std::string> texts;
    for (const JSON& element : require(json.array(), keyword, file)) {
        texts.push_back(require(element.string(), keyword, file));
    }
    return texts;
}

std::vector<std::string> typesOf(const JSON& json, const std::string& file) {
    static const std::set<std::string_view> known{"null", "boolean", "integer", "number", "string", "array", "object"};
    const auto single = json.string();
    auto types = single ? std::vector{*single} : strings(json, "type", file);
    for (const std::string& type : types) {
        if (!known.contains(type)) fail(file, "there is no type \"" + type + "\"");
    }
    if (types.empty()) fail(file, "\"type\" names none");
    return types;
}

JSON numberOf(const JSON& json, const std::string& keyword, const std::string& file) {
    if (!json.double_()) fail(file, "\"" + keyword + "\" is no number");
    return json;
}

// "%2F" as "/".
std::string unescapedURI(std::string_view text) {
    std::string result;
    for (std::size_t i = 0; i < text.size(); ++i) {
        unsigned byte = 0;
        if (text[i] == '%' && i + 2 < text.size() &&
            std::from_chars(&text[i + 1], &text[i + 1] + 2, byte, 16).ptr == &text[i + 1] + 2) {
            result += static_cast<char>(byte);
            i += 2;
        } else {
            result += text[i];
        }
    }
    return result;
}

std::string unescapedPointer(std::string_view text) {
    std::string result;
    for (std::size_t i = 0; i < text.size(); ++i) {
        const bool isEscape = text[i] == '~' && i + 1 < text.size() && (text[i + 1] == '0' || text[i + 1] == '1');
        result += !isEscape ? text[i] : text[++i] == '0' ? '~' : '/';
    }
    return result;
}

// The value at a JSON pointer.
JSON at(JSON json, std::string_view pointer, const std::string& file) {
    const std::string whole(pointer);
    while (!pointer.empty()) {
        pointer.remove_prefix(1);
        const std::string_view part = pointer.substr(0, pointer.find('/'));
        pointer.remove_prefix(part.size());
        std::size_t index = 0;
        const bool isIndex =
            std::from_chars(part.data(), part.data() + part.size(), index).ptr == part.data() + part.size();
        JSON next = json[unescapedPointer(part)];
        json = next.exists() || !isIndex ? std::move(next) : json[static_cast<std::int64_t>(index)];
    }
    if (!json.exists()) fail(file, "it refers to " + whole + ", which is not there");
    return json;
}

// "data.events[3]" of "data.events[3].data.screen", with what stands behind it; nothing of a path elsewhere.
std::pair<std::string, std::string> eventAndRest(const std::string& path) {
    constexpr std::string_view events = "data.events[";
    const auto end = path.starts_with(events) ? path.find(']') : std::string::npos;
    if (end == std::string::npos) return {"", path};
    return {path.substr(0, end + 1), end + 2 < path.size() ? path.substr(end + 2) : ""};
}

std::string nameOf(const JSON& document, const std::string& event) {
    std::size_t index = 0;
    const std::size_t begin = event.find('[') + 1;
    std::from_chars(event.data() + begin, event.data() + event.size(), index);
    return document["data"]["events"][index]["metadata"]["name"].string().value_or("?");
}

// Keys come from whoever sent the document, and the line goes to a terminal.
std::string printable(std::string text) {
    for (char& c : text) {
        if (static_cast<unsigned char>(c) < 0x20 || c == 0x7f) c = '?';
    }
    return text;
}

}  // namespace

SchemaFolder::SchemaFolder(const std::filesystem::path& directory) : directory_(directory) {
    document_ = schemaAt(documentFile, "");
}

const JSON& SchemaFolder::contentsOf(const std::string& file) {
    if (const auto found = files_.find(file); found != files_.end()) return found->second;
    if (file.empty() || file.find('/') != std::string::npos) fail(file, "it is not in the directory");
    std::ifstream in(directory_ / file, std::ios::binary);
    const std::string text{std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
    if (!in.is_open() || in.bad() || text.empty()) fail(file, "it cannot be read");
    const JSON json(text);
    if (!json.exists()) fail(file, "it is not JSON");
    return files_.emplace(file, json).first->second;
}

const Schema* SchemaFolder::schemaAt(const std::string& file, const std::string& pointer) {
    auto& place = schemas_[file + "#" + pointer];
    if (!place) {
        place = std::make_unique<Schema>();  // before it is read: it may refer to itself
        Schema& schema = *place;
        read(at(contentsOf(file), pointer, file), file, schema);
        return &schema;
    }
    return place.get();
}

const Schema* SchemaFolder::resolve(const std::string& reference, const std::string& file) {
    const std::size_t hash = reference.find('#');
    const std::string target = unescapedURI(reference.substr(0, hash));
    const std::string pointer =
        hash == std::string::npos ? "" : unescapedURI(std::string_view(reference).substr(hash + 1));
    if (!pointer.empty() && !pointer.starts_with('/')) fail(file, "it refers to an anchor, " + reference);
    return schemaAt(target.empty() ? file : target, pointer);
}

void SchemaFolder::read(const JSON& json, const std::string& file, Schema& schema) {
    if (const auto allowsAll = json.bool_()) {
        schema.allowsNothing = !*allowsAll;
        return;
    }
    const auto keywords = json.object();
    if (!keywords) fail(file, "a schema is neither an object nor a boolean");
    for (const auto& [keyword, value] : *keywords) readKeyword(keyword, value, file, schema);
}

void SchemaFolder::readKeyword(const std::string& keyword, const JSON& json, const std::string& file, Schema& schema) {
    const auto single = [&](std::unique_ptr<Schema>& part) {
        part = std::make_unique<Schema>();
        read(json, file, *part);
    };
    const auto several = [&](std::vector<Schema>& parts) {
        for (const JSON& part : require(json.array(), keyword, file)) read(part, file, parts.emplace_back());
    };
    const auto count = [&] { return static_cast<std::size_t>(require(json.unsignedInteger(), keyword, file)); };
    static const std::set<std::string_view> ignored{"$schema", "$id",         "$comment", "$defs",
                                                    "title",   "description", "format"};
    const std::map<std::string_view, std::function<void()>> readers{
        {"$ref", [&] { schema.reference = resolve(require(json.string(), keyword, file), file); }},
        {"type", [&] { schema.types = typesOf(json, file); }},
        {"enum", [&] { schema.values = require(json.array(), keyword, file); }},
        {"const", [&] { schema.values = std::vector{json}; }},
        {"minimum", [&] { schema.minimum = numberOf(json, keyword, file); }},
        {"maximum", [&] { schema.maximum = numberOf(json, keyword, file); }},
        {"minItems", [&] { schema.minItems = count(); }},
        {"maxItems", [&] { schema.maxItems = count(); }},
        {"required", [&] { schema.required = strings(json, keyword, file); }},
        {"properties",
         [&] {
             for (const auto& [name, part] : require(json.object(), keyword, file)) {
                 read(part, file, schema.properties[name]);
             }
         }},
        {"additionalProperties", [&] { single(schema.additionalProperties); }},
        {"items", [&] { single(schema.items); }},
        {"anyOf", [&] { several(schema.anyOf); }},
        {"allOf", [&] { several(schema.allOf); }},
        {"if", [&] { single(schema.condition); }},
        {"then", [&] { single(schema.consequence); }},
        {"else", [&] { single(schema.alternative); }},
    };
    if (ignored.contains(keyword)) return;
    const auto reader = readers.find(keyword);
    if (reader == readers.end()) fail(file, "the keyword \"" + keyword + "\" is not understood here");
    reader->second();
}

SchemaFolder::Report SchemaFolder::check(const JSON& document) const {
    std::vector<Mismatch> mismatches;
    validate(*document_, document, "", mismatches);
    Report report;
    std::string previous = "none yet";
    for (const auto& [path, reason] : mismatches) {
        auto [event, rest] = eventAndRest(path);
        if (std::exchange(previous, event) == event) continue;  // one line for each
        if (++report.mismatches > mostLines) continue;
        const std::string what = event.empty() ? "document" : event + " " + nameOf(document, event);
        report.lines.push_back(printable(what + ": " + (rest.empty() ? "" : rest + " ") + reason));
    }
    if (report.mismatches > mostLines) {
        report.lines.push_back("and " + std::to_string(report.mismatches - mostLines) + " more");
    }
    return report;
}

}  // namespace collector
