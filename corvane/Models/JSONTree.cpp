#include <corvane/Models/JSONTree.h>

#include <corvane/Models/JSONParser.h>
#include <corvane/Platform/JSONText.h>

#include <boost/json/value_stack.hpp>

#include <algorithm>
#include <vector>

namespace corvane::jsontree {

namespace {

namespace json = boost::json;

class Builder final : public JSONListener {
  public:
    Builder() { stack_.reset(); }
    json::value take() { return stack_.release(); }

    void endObject(std::size_t members) override { stack_.push_object(members); }
    void endArray(std::size_t elements) override { stack_.push_array(elements); }
    void keyPart(std::string_view part) override { stack_.push_chars({part.data(), part.size()}); }
    void key(std::string_view lastPart) override { stack_.push_key({lastPart.data(), lastPart.size()}); }
    void stringPart(std::string_view part) override { stack_.push_chars({part.data(), part.size()}); }
    void string(std::string_view lastPart) override { stack_.push_string({lastPart.data(), lastPart.size()}); }
    void integer(std::int64_t number) override { stack_.push_int64(number); }
    void unsignedInteger(std::uint64_t number) override { stack_.push_uint64(number); }
    void number(double number) override { stack_.push_double(number); }
    void boolean(bool value) override { stack_.push_bool(value); }
    void null() override { stack_.push_null(); }

  private:
    json::value_stack stack_;
};

std::string_view view(json::string_view text) {
    return {text.data(), text.size()};
}

void appendScalar(std::string& out, const json::value& value) {
    switch (value.kind()) {
        case json::kind::null:
            out += "null";
            break;
        case json::kind::bool_:
            out += value.get_bool() ? "true" : "false";
            break;
        case json::kind::int64:
            jsontext::appendInteger(out, value.get_int64());
            break;
        case json::kind::uint64:
            jsontext::appendUnsigned(out, value.get_uint64());
            break;
        case json::kind::double_:
            (void)jsontext::appendDouble(out, value.get_double());  // the parser takes none that is not finite
            break;
        case json::kind::string:
            // The parser has checked the text.
            if (!jsontext::appendString(out, view(value.get_string()))) out += "null";
            break;
        default:
            break;
    }
}

class Writer {
  public:
    explicit Writer(JSONWritingOptions options) : options_(options) {}

    void write(const json::value& value) {
        if (const auto* object = value.if_object()) {
            writeObject(*object);
        } else if (const auto* array = value.if_array()) {
            open('[');
            for (const auto& element : *array) {
                separate();
                write(element);
            }
            close(']', array->empty());
        } else {
            appendScalar(out, value);
        }
    }

    std::string out;

  private:
    void writeObject(const json::object& object) {
        std::vector<const json::key_value_pair*> members;
        members.reserve(object.size());
        for (const auto& member : object) members.push_back(&member);
        if (options_.sortedKeys) {
            std::sort(members.begin(), members.end(), [](const auto* a, const auto* b) { return a->key() < b->key(); });
        }
        open('{');
        for (const auto* member : members) {
            separate();
            if (!jsontext::appendString(out, view(member->key()))) out += "\"\"";
            out += options_.prettyPrinted ? ": " : ":";
            write(member->value());
        }
        close('}', object.empty());
    }

    void open(char bracket) {
        out += bracket;
        ++level_;
        first_ = true;
    }
    void separate() {
        if (!first_) out += ',';
        first_ = false;
        breakLine();
    }
    void close(char bracket, bool empty) {
        --level_;
        if (!empty) breakLine();
        out += bracket;
        first_ = false;
    }
    void breakLine() {
        if (options_.prettyPrinted) out.append(1, '\n').append(level_ * 2, ' ');
    }

    JSONWritingOptions options_;
    std::size_t level_ = 0;
    bool first_ = true;
};

void appendDescription(std::string& out, const json::value& value) {
    const auto separate = [&out](bool& first) {
        if (!first) out += ", ";
        first = false;
    };
    bool first = true;
    if (const auto* object = value.if_object()) {
        out += '[';
        for (const auto& member : *object) {
            separate(first);
            (void)jsontext::appendString(out, view(member.key()));
            out += ": ";
            appendDescription(out, member.value());
        }
        out += object->empty() ? ":]" : "]";
    } else if (const auto* array = value.if_array()) {
        out += '[';
        for (const auto& element : *array) {
            separate(first);
            appendDescription(out, element);
        }
        out += ']';
    } else {
        appendScalar(out, value);
    }
}

}  // namespace

std::optional<json::value> parse(std::string_view text, int maximumDepth) {
    Builder builder;
    if (!parseJSON(text, maximumDepth, builder)) return std::nullopt;
    return builder.take();
}

std::string write(const json::value& value, JSONWritingOptions options) {
    Writer writer(options);
    writer.write(value);
    return std::move(writer.out);
}

std::string describe(const json::value& value) {
    std::string out;
    appendDescription(out, value);
    return out;
}

}  // namespace corvane::jsontree
