#include <corvane/Catalogue/CataloguePage.h>

#include <corvane/Catalogue/CatalogueNames.h>
#include <corvane/Models/JSONTree.h>
#include <corvane/Platform/JSONText.h>

#include <algorithm>
#include <map>
#include <string_view>

namespace corvane::catalogue {

namespace {

// Text of the host's as Markdown shows it, in a table too: one line, and nothing in it that means something.
std::string escaped(std::string_view text) {
    constexpr std::string_view special = "\\`*_{}[]<>#|&";
    std::string result;
    for (const char c : text) {
        if (special.find(c) != special.npos) result += '\\';
        result += c == '\n' || c == '\r' ? ' ' : c;
    }
    return result;
}

class Page {
  public:
    explicit Page(const Vocabulary& vocabulary) : vocabulary_(vocabulary), names_(namesOf(vocabulary.definitions)) {}
    std::string write() &&;

  private:
    void addEvents();
    void addSession();
    void addTypes();
    void addDefinition(std::size_t index);
    void addOwn(const Definition& definition);
    void addMembers(std::string_view what, const std::vector<Member>& members);
    void addParagraph(const std::string& text);
    std::string anchorOf(std::size_t definition) const { return "type-" + plainName(names_[definition]); }
    std::string typeOf(const Shape& shape) const;
    std::string elementOf(const Shape& shape) const;

    const Vocabulary& vocabulary_;
    const std::vector<std::string> names_;
    std::map<std::string_view, std::size_t> byName_;
    std::string out_;
};

std::string integerType(const Shape& shape) {
    return "integer, " + std::to_string(shape.minimum) + " to " + std::to_string(shape.maximum);
}

std::string Page::elementOf(const Shape& shape) const {
    const Shape& element = shape.element.front();
    return element.mayBeNull ? "(" + typeOf(element) + ")" : typeOf(element);
}

std::string Page::typeOf(const Shape& shape) const {
    using Kind = Shape::Kind;
    const auto type = [&]() -> std::string {
        switch (shape.kind) {
            case Kind::anything:
                return "any JSON";
            case Kind::object:
                return "any object";
            case Kind::boolean:
                return "boolean";
            case Kind::integer:
                return integerType(shape);
            case Kind::real:
                return "number";
            case Kind::text:
                return "text";
            case Kind::date:
                return "date, in milliseconds since 1970";
            case Kind::duration:
                return "duration, in milliseconds";
            case Kind::array:
                return "array of " + (shape.length ? std::to_string(*shape.length) + " times " : "") + elementOf(shape);
            case Kind::map:
                return "object, each member " + elementOf(shape);
            case Kind::named:
                return "[" + escaped(names_[shape.definition]) + "](#" + anchorOf(shape.definition) + ")";
        }
        return {};
    };
    return type() + (shape.mayBeNull ? ", or null" : "");
}

void Page::addParagraph(const std::string& text) {
    if (!text.empty()) out_ += text + "\n\n";
}

void Page::addMembers(std::string_view what, const std::vector<Member>& members) {
    if (members.empty()) return addParagraph("It has none of its own.");
    out_.append("| ").append(what).append(" | type | | |\n|---|---|---|---|\n");
    for (const Member& member : members) {
        out_ += "| " + escaped(member.name) + " | " + typeOf(member.shape) +
                (member.isRequired ? " | required | " : " | optional | ") + escaped(member.description) + " |\n";
    }
    out_ += '\n';
}

void Page::addEvents() {
    for (const Event& event : vocabulary_.events) {
        addParagraph("## " + escaped(event.type.name()));
        addParagraph(escaped(event.description));
        addMembers("property", event.properties);
    }
}

void Page::addSession() {
    if (vocabulary_.session.empty()) return;
    addParagraph("## Session");
    addMembers("key", vocabulary_.session);
}

void Page::addOwn(const Definition& definition) {
    if (definition.schema.empty()) return addParagraph("Written by the type's own code: " + typeOf(definition.shape));
    const auto schema = jsontree::parse(definition.schema, jsontext::maximumDepth);  // has been looked at
    if (schema)
        addParagraph("As its schema says:\n\n```json\n" + jsontree::write(*schema, {.prettyPrinted = true}) + "\n```");
}

void Page::addDefinition(std::size_t index) {
    const Definition& definition = vocabulary_.definitions[index];
    addParagraph("### <a id=\"" + anchorOf(index) + "\"></a>" + escaped(names_[index]));
    addParagraph(escaped(definition.description));
    switch (definition.form) {
        case Definition::Form::record:
            return addMembers("field", definition.members);
        case Definition::Form::own:
            return addOwn(definition);
        case Definition::Form::enumeration:
            break;
    }
    if (definition.values.empty()) return addParagraph("An enumeration: " + typeOf(definition.shape));
    out_ += "One of:\n\n";
    for (const std::string& value : definition.values) out_ += "- " + escaped(value) + "\n";
    out_ += '\n';
}

void Page::addTypes() {
    if (byName_.empty()) return;
    addParagraph("## Types");
    for (const auto& [name, index] : byName_) addDefinition(index);
}

std::string Page::write() && {
    for (std::size_t i = 0; i < names_.size(); ++i) byName_.emplace(names_[i], i);
    addParagraph("# Events");
    addParagraph("<!-- " + std::string(writtenBy) + " -->");
    addEvents();
    addSession();
    addTypes();
    out_.pop_back();  // one line break is enough at the end
    return std::move(out_);
}

}  // namespace

std::string page(const Vocabulary& vocabulary) {
    return Page(vocabulary).write();
}

}  // namespace corvane::catalogue
