#include <corvane/Catalogue/SchemaComparison.h>

#include <corvane/Models/JSONTree.h>

#include <algorithm>
#include <optional>
#include <string_view>

namespace corvane::catalogue {

namespace {

namespace json = boost::json;
using json::object;
using json::value;

const value* find(const value* within, std::string_view key) {
    const auto* object = within ? within->if_object() : nullptr;
    return object ? object->if_contains({key.data(), key.size()}) : nullptr;
}

std::string textOf(const value& value) {
    return jsontree::write(value, {});
}

std::string stringOf(const value* value) {
    const auto* text = value ? value->if_string() : nullptr;
    return text ? std::string(text->data(), text->size()) : std::string();
}

int digitOf(char c) {
    return c >= '0' && c <= '9' ? c - '0' : (c | 32) >= 'a' && (c | 32) <= 'f' ? (c | 32) - 'a' + 10 : -1;
}

// The name in "#/$defs/<name>", as it was before it was escaped.
std::string nameIn(std::string_view escaped) {
    std::string name;
    for (std::size_t i = 0; i < escaped.size(); ++i) {
        const char next = i + 1 < escaped.size() ? escaped[i + 1] : '\0';
        if (escaped[i] == '%' && i + 2 < escaped.size() && digitOf(next) >= 0 && digitOf(escaped[i + 2]) >= 0) {
            name += static_cast<char>(digitOf(next) * 16 + digitOf(escaped[i + 2]));
            i += 2;
        } else if (escaped[i] == '~' && (next == '0' || next == '1')) {
            name += next == '0' ? '~' : '/';
            ++i;
        } else {
            name += escaped[i];
        }
    }
    return name;
}

/// A schema without its detours: references followed, null taken apart.
struct Plain {
    const value* schema = nullptr;
    bool mayBeNull = false;
    std::string description;  // the outermost
};

Plain plain(const value* schema, const value& file) {
    Plain result{schema, false, stringOf(find(schema, "description"))};
    for (int detours = 0; detours < 64; ++detours) {
        constexpr std::string_view definitions = "#/$defs/";
        const std::string reference = stringOf(find(result.schema, "$ref"));
        const value* choices = find(result.schema, "anyOf");
        const value* next = nullptr;
        if (reference.starts_with(definitions)) {
            next = find(find(&file, "$defs"), nameIn(reference.substr(definitions.size())));
        } else if (choices && choices->is_array() && choices->get_array().size() == 2 &&
                   stringOf(find(&choices->get_array()[1], "type")) == "null") {
            next = &choices->get_array()[0];
            result.mayBeNull = true;
        }
        if (!next) break;
        result.schema = next;
    }
    return result;
}

// Without an object, what `true` says is said by an object that says nothing.
const object& objectOf(const value* schema) {
    static const object anything;
    return schema && schema->is_object() ? schema->get_object() : anything;
}

bool isRequired(const object& schema, const std::string& name) {
    const value* required = schema.if_contains("required");
    return required && required->is_array() &&
           std::ranges::any_of(required->get_array(), [&](const value& entry) { return stringOf(&entry) == name; });
}

// The values of "enum" or "const", or nothing.
std::optional<json::array> valuesOf(const object& schema) {
    if (const value* constant = schema.if_contains("const")) return json::array{*constant};
    const value* values = schema.if_contains("enum");
    return values && values->is_array() ? std::optional(values->get_array()) : std::nullopt;
}

bool contains(const json::array& values, const value& sought) {
    return std::ranges::find(values, sought) != values.end();
}

}  // namespace

void SchemaComparison::add(const std::string& path, std::string what, bool isBreaking) {
    changes_.push_back({event_, path, std::move(what), isBreaking});
}

void SchemaComparison::compareType(const Object& before, const Object& after, const std::string& path) {
    const value* was = before.if_contains("type");
    const value* is = after.if_contains("type");
    // A list of values says more than a type, and has one of its own.
    if (valuesOf(before) || valuesOf(after) || (!was && !is) || (was && is && *was == *is)) return;
    const bool isNarrower = !was || (stringOf(was) == "number" && stringOf(is) == "integer");
    add(path, "is " + (is ? textOf(*is) : "anything") + " now, was " + (was ? textOf(*was) : "anything"), !isNarrower);
}

void SchemaComparison::compareBound(const char* keyword, bool isLower, const Object& before, const Object& after,
                                    const std::string& path) {
    const value* was = before.if_contains(keyword);
    const value* is = after.if_contains(keyword);
    if ((!was && !is) || (was && is && *was == *is)) return;
    const auto isLess = [](const value& a, const value& b) {
        if (a.is_double() || b.is_double()) return a.to_number<double>() < b.to_number<double>();
        if (a.is_uint64() || b.is_uint64()) {  // one of them is beyond the other's reach, or both are
            return b.is_uint64() && (!a.is_uint64() || a.get_uint64() < b.get_uint64());
        }
        return a.get_int64() < b.get_int64();
    };
    const bool isWider =
        was && (!is || !was->is_number() || !is->is_number() || (isLower ? isLess(*is, *was) : isLess(*was, *is)));
    // Of something that had another type before, and so other bounds, that has been said.
    const bool hadType = before.contains("type") && after.contains("type") && before.at("type") != after.at("type");
    if (hadType) return;
    add(path,
        std::string(keyword) + " is " + (is ? textOf(*is) : "none") + " now, was " + (was ? textOf(*was) : "none"),
        isWider);
}

void SchemaComparison::compareEnumeration(const Object& before, const Object& after, const std::string& path) {
    const auto was = valuesOf(before);
    const auto is = valuesOf(after);
    if (!was && !is) return;
    if (!was)
        return add(path, "has a list of values now",
                   before.contains("type") && is && !is->empty() &&
                       is->front().is_string() != (stringOf(before.if_contains("type")) == "string"));
    if (!is) return add(path, "has no list of values any more", true);
    for (const value& added : *is) {
        if (!contains(*was, added)) add(path, "may be " + textOf(added) + " now", true);
    }
    for (const value& removed : *was) {
        if (!contains(*is, removed)) add(path, "is never " + textOf(removed) + " any more", false);
    }
}

void SchemaComparison::compareField(const Object& before, const Object& after, const std::string& name,
                                    const std::string& path) {
    const auto fieldOf = [&](const Object& schema) {
        const value* properties = schema.if_contains("properties");
        return find(properties, name);
    };
    const value* was = fieldOf(before);
    const value* is = fieldOf(after);
    const std::string place = path.empty() ? name : path + "." + name;
    if (!is) return add(place, "is gone", true);
    if (!was) return add(place, "is new", false);
    const bool wasRequired = isRequired(before, name);
    if (wasRequired != isRequired(after, name)) {
        add(place, wasRequired ? "is optional now" : "is required now", wasRequired);
    }
    compare(was, is, place);
}

void SchemaComparison::compareFields(const Object& before, const Object& after, const std::string& path) {
    std::set<std::string> names;
    for (const Object* schema : {&before, &after}) {
        const value* properties = schema->if_contains("properties");
        if (!properties || !properties->is_object()) continue;
        for (const auto& property : properties->get_object())
            names.emplace(property.key().data(), property.key().size());
    }
    for (const std::string& name : names) compareField(before, after, name, path);
}

// What a catalogue never writes by itself may mean anything.
void SchemaComparison::compareRest(const Object& before, const Object& after, const std::string& path) {
    static const std::set<std::string_view> understood{
        "$schema",     "$id",      "$comment",   "$defs",    "title",
        "description", "type",     "minimum",    "maximum",  "enum",
        "const",       "format",   "properties", "required", "additionalProperties",
        "items",       "minItems", "maxItems"};
    std::set<std::string> keywords;
    for (const Object* schema : {&before, &after}) {
        for (const auto& member : *schema) keywords.emplace(member.key().data(), member.key().size());
    }
    for (const std::string& keyword : keywords) {
        if (understood.contains(keyword)) continue;
        const value* was = before.if_contains(keyword);
        const value* is = after.if_contains(keyword);
        if (!was || !is || *was != *is) add(path, "has another \"" + keyword + "\" in its schema", true);
    }
}

void SchemaComparison::compare(const value* before, const value* after, const std::string& path) {
    const Plain was = plain(before, before_);
    const Plain is = plain(after, after_);
    const auto pair = std::pair(was.schema, is.schema);
    if (!isBeingCompared_.insert(pair).second) return;  // a type within itself
    if (was.mayBeNull != is.mayBeNull)
        add(path, is.mayBeNull ? "may be null now" : "is never null any more", is.mayBeNull);
    if (was.description != is.description) add(path, "is described otherwise", false);

    const Object& old = objectOf(was.schema);
    const Object& now = objectOf(is.schema);
    compareType(old, now, path);
    compareEnumeration(old, now, path);
    for (const char* lower : {"minimum", "minItems"}) compareBound(lower, true, old, now, path);
    for (const char* upper : {"maximum", "maxItems"}) compareBound(upper, false, old, now, path);
    if (stringOf(old.if_contains("format")) != stringOf(now.if_contains("format"))) {
        add(path, "has another unit or format", true);
    }
    compareFields(old, now, path);
    for (const auto& [keyword, place] : {std::pair("items", "[]"), std::pair("additionalProperties", ".*")}) {
        const value* element = old.if_contains(keyword);
        const value* newElement = now.if_contains(keyword);
        if (element || newElement) compare(element, newElement, path + place);
    }
    compareRest(old, now, path);
    isBeingCompared_.erase(pair);
}

}  // namespace corvane::catalogue
