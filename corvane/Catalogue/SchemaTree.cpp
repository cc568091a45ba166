#include <corvane/Catalogue/SchemaTree.h>

#include <corvane/Catalogue/CatalogueNames.h>
#include <corvane/Models/JSONTree.h>
#include <corvane/Models/ProcessEvent.h>
#include <corvane/Platform/Error.h>
#include <corvane/Platform/JSONText.h>
#include <corvane/Processing/UserEvents.h>

#include <boost/json/value.hpp>

#include <set>
#include <string_view>
#include <utility>

namespace corvane::catalogue {

namespace {

namespace json = boost::json;

constexpr auto dialect = "https://json-schema.org/draft/2020-12/schema";

json::string_view text(std::string_view text) {
    return {text.data(), text.size()};
}

// A name as part of a reference: a JSON pointer within a fragment of a URI.
std::string referenceTo(std::string_view definition) {
    constexpr std::string_view plain = "-._!$&'()*+,;=:@?";
    constexpr std::string_view digits = "0123456789ABCDEF";
    std::string reference = "#/$defs/";
    for (const char c : definition) {
        const auto byte = static_cast<unsigned char>(c);
        if (c == '~') {
            reference += "~0";
        } else if (c == '/') {
            reference += "~1";
        } else if ((c >= '0' && c <= '9') || ((c | 32) >= 'a' && (c | 32) <= 'z') || plain.find(c) != plain.npos) {
            reference += c;
        } else {
            reference.append({'%', digits[byte >> 4U], digits[byte & 15U]});
        }
    }
    return reference;
}

void setDescription(json::object& schema, std::string_view description) {
    if (!description.empty()) schema["description"] = text(description);
}

json::object typed(const char* type, const char* format = nullptr) {
    json::object schema{{"type", type}};
    if (format) schema["format"] = format;
    return schema;
}

/// Writes the schemas of one file: keeps which definitions it refers to.
class FileWriter {
  public:
    FileWriter(const Vocabulary& vocabulary, const std::vector<std::string>& names)
        : vocabulary_(vocabulary), names_(names) {}

    json::object record(const std::vector<Member>& members);
    /// The definitions that have been referred to, and those that they refer to.
    json::object definitions();

  private:
    json::object schemaOf(const Shape& shape);
    json::object notNullSchemaOf(const Shape& shape);
    json::object array(const Shape& shape);
    json::value schemaOf(const Definition& definition);
    json::value own(const Definition& definition);

    const Vocabulary& vocabulary_;
    const std::vector<std::string>& names_;
    std::set<std::size_t> used_;
};

json::object FileWriter::array(const Shape& shape) {
    json::object schema = typed("array");
    schema["items"] = schemaOf(shape.element.front());
    if (shape.length) {
        schema["minItems"] = *shape.length;
        schema["maxItems"] = *shape.length;
    }
    return schema;
}

json::object FileWriter::notNullSchemaOf(const Shape& shape) {
    using Kind = Shape::Kind;
    switch (shape.kind) {
        case Kind::anything:
            return {};
        case Kind::object:
            return typed("object");
        case Kind::boolean:
            return typed("boolean");
        case Kind::integer:
            return {{"type", "integer"}, {"minimum", shape.minimum}, {"maximum", shape.maximum}};
        case Kind::real:
            return typed("number");
        case Kind::text:
            return typed("string");
        case Kind::date:
            return typed("integer", "milliseconds-since-1970");
        case Kind::duration:
            return typed("integer", "milliseconds");
        case Kind::array:
            return array(shape);
        case Kind::map:
            return {{"type", "object"}, {"additionalProperties", schemaOf(shape.element.front())}};
        case Kind::named:
            used_.insert(shape.definition);
            return {{"$ref", referenceTo(names_[shape.definition])}};
    }
    return {};
}

json::object FileWriter::schemaOf(const Shape& shape) {
    json::object schema = notNullSchemaOf(shape);
    if (!shape.mayBeNull || schema.empty()) return schema;
    return {{"anyOf", {std::move(schema), typed("null")}}};
}

json::object FileWriter::record(const std::vector<Member>& members) {
    json::object properties;
    json::array required;
    for (const Member& member : members) {
        json::object schema = schemaOf(member.shape);
        setDescription(schema, member.description);
        properties[text(member.name)] = std::move(schema);
        if (member.isRequired) required.push_back(json::value(text(member.name)));
    }
    json::object schema = typed("object");
    schema["properties"] = std::move(properties);
    schema["required"] = std::move(required);
    return schema;
}

json::value FileWriter::own(const Definition& definition) {
    if (definition.schema.empty()) {
        json::object schema = notNullSchemaOf(definition.shape);
        schema["$comment"] = "Written by the type's own code: its declaration does not say what.";
        return schema;
    }
    auto stated = jsontree::parse(definition.schema, jsontext::maximumDepth);
    if (stated && (stated->is_object() || stated->is_bool())) return *std::move(stated);
    throw InvalidArgument("the schema that is stated for " + definition.type.qualifiedName() +
                          " is neither a JSON object nor a boolean");
}

json::value FileWriter::schemaOf(const Definition& definition) {
    json::value value;
    if (definition.form == Definition::Form::own) {
        value = own(definition);
    } else if (definition.form == Definition::Form::record) {
        value = record(definition.members);
    } else {
        json::object schema = notNullSchemaOf(definition.shape);
        if (!definition.values.empty()) {
            json::array values;
            for (const std::string& text : definition.values) values.push_back(*jsontree::parse(text, 1));
            schema = {{"enum", std::move(values)}};
        }
        value = std::move(schema);
    }
    if (value.is_object() && !value.get_object().contains("description")) {
        setDescription(value.get_object(), definition.description);
    }
    return value;
}

json::object FileWriter::definitions() {
    std::map<std::size_t, json::value> schemas;
    while (schemas.size() < used_.size()) {
        for (const std::size_t index : std::set(used_)) {
            if (!schemas.contains(index)) schemas.emplace(index, schemaOf(vocabulary_.definitions[index]));
        }
    }
    std::map<std::string_view, json::value*> byName;
    for (auto& [index, schema] : schemas) byName.emplace(names_[index], &schema);
    json::object object;
    for (auto& [name, schema] : byName) object[text(name)] = std::move(*schema);
    return object;
}

json::object header(const std::string& file, std::string_view title, std::string_view description) {
    json::object schema{{"$schema", dialect}, {"$id", file}, {"$comment", text(writtenBy)}, {"title", text(title)}};
    setDescription(schema, description);
    return schema;
}

void addMembers(json::object& schema, const json::object& more) {
    for (const auto& member : more) schema.insert(member);
}

std::string write(const json::object& schema) {
    return jsontree::write(json::value(schema), {.prettyPrinted = true}) + "\n";
}

std::string eventSchema(const Vocabulary& vocabulary, const std::vector<std::string>& names, const Event& event) {
    FileWriter writer(vocabulary, names);
    json::object schema = header(schemaFileOf(event.type.name()), event.type.name(), event.description);
    addMembers(schema, writer.record(event.properties));
    schema["$defs"] = writer.definitions();
    return write(schema);
}

json::object constant(std::string_view value) {
    return {{"const", text(value)}};
}

json::object requiring(json::object properties) {
    json::array required;
    for (const auto& property : properties) required.push_back(json::value(property.key()));
    json::object schema = typed("object");
    schema["properties"] = std::move(properties);
    schema["required"] = std::move(required);
    return schema;
}

// One choice is made by the name, so that a validator says what is wrong with the event, and not with all others.
json::object choiceOf(const Event& event) {
    return {{"if", {{"properties", {{"metadata", {{"properties", {{"name", constant(event.type.name())}}}}}}}}},
            {"then", {{"properties", {{"data", {{"$ref", schemaFileOf(event.type.name())}}}}}}}};
}

json::object anyEvent(const Vocabulary& vocabulary) {
    json::array names;
    json::array choices;
    for (const Event& event : vocabulary.events) {
        names.push_back(json::value(text(event.type.name())));
        choices.push_back(choiceOf(event));
    }
    json::object schema = requiring({{"data", typed("object")},
                                     {"metadata", requiring({{"name", {{"enum", std::move(names)}}},
                                                             {"version", constant(ProcessEvent::version())}})}});
    if (!choices.empty()) schema["allOf"] = std::move(choices);
    return schema;
}

json::object sessionSchema(const Vocabulary& vocabulary, FileWriter& writer) {
    std::vector<Member> members{{.name = "sessionID", .shape = {.kind = Shape::Kind::text}}};
    members.insert(members.end(), vocabulary.session.begin(), vocabulary.session.end());
    json::object schema = writer.record(members);
    schema["additionalProperties"] = typed("object");
    return schema;
}

std::string documentSchema(const Vocabulary& vocabulary, const std::vector<std::string>& names) {
    FileWriter writer(vocabulary, names);
    json::object schema = header(std::string(documentSchemaFile), "user-events",
                                 "What is uploaded: the events of one session, or of one group of it.");
    json::object events = typed("array");
    events["items"] = anyEvent(vocabulary);
    addMembers(schema, requiring({{"metadata", requiring({{"version", constant(UserEvents::formatVersion)},
                                                          {"identifier", typed("string", "uuid")}})},
                                  {"data", requiring({{"session", sessionSchema(vocabulary, writer)},
                                                      {"events", std::move(events)}})}}));
    schema["$defs"] = writer.definitions();
    return write(schema);
}

}  // namespace

std::map<std::string, std::string> schemaFiles(const Vocabulary& vocabulary) {
    const std::vector<std::string> names = namesOf(vocabulary.definitions);
    std::map<std::string, std::string> files;
    for (const Event& event : vocabulary.events) {
        files.emplace(schemaFileOf(event.type.name()), eventSchema(vocabulary, names, event));
    }
    files.emplace(documentSchemaFile, documentSchema(vocabulary, names));
    return files;
}

}  // namespace corvane::catalogue
