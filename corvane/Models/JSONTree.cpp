#include <corvane/Models/JSONTree.h>

#include <corvane/Platform/JSONText.h>

#include <boost/json/basic_parser_impl.hpp>
#include <boost/json/value_stack.hpp>

#include <algorithm>
#include <charconv>
#include <cmath>
#include <vector>

namespace corvane::jsontree {

namespace {

namespace json = boost::json;

// Builds a tree from the parser's events. The library's own handler rounds some doubles to a neighbour, so a number
// would not come back as it was written; this one keeps the text of a number and converts it exactly.
class Builder {
  public:
    static constexpr std::size_t max_object_size = json::object::max_size();
    static constexpr std::size_t max_array_size = json::array::max_size();
    static constexpr std::size_t max_key_size = json::string::max_size();
    static constexpr std::size_t max_string_size = json::string::max_size();

    Builder() { stack_.reset(); }
    json::value take() { return stack_.release(); }

    bool on_document_begin(json::error_code&) { return true; }
    bool on_document_end(json::error_code&) { return true; }
    bool on_object_begin(json::error_code&) { return true; }
    bool on_object_end(std::size_t count, json::error_code&) { return stack_.push_object(count), true; }
    bool on_array_begin(json::error_code&) { return true; }
    bool on_array_end(std::size_t count, json::error_code&) { return stack_.push_array(count), true; }
    bool on_key_part(json::string_view part, std::size_t, json::error_code&) { return stack_.push_chars(part), true; }
    bool on_key(json::string_view part, std::size_t, json::error_code&) { return stack_.push_key(part), true; }
    bool on_string_part(json::string_view part, std::size_t, json::error_code&) {
        return stack_.push_chars(part), true;
    }
    bool on_string(json::string_view part, std::size_t, json::error_code&) { return stack_.push_string(part), true; }
    bool on_number_part(json::string_view part, json::error_code&) {
        number_.append(part.data(), part.size());
        return true;
    }
    bool on_int64(std::int64_t number, json::string_view, json::error_code&) {
        number_.clear();
        return stack_.push_int64(number), true;
    }
    bool on_uint64(std::uint64_t number, json::string_view, json::error_code&) {
        number_.clear();
        return stack_.push_uint64(number), true;
    }
    bool on_double(double approximation, json::string_view part, json::error_code& error) {
        number_.append(part.data(), part.size());
        double exact = approximation;
        std::from_chars(number_.data(), number_.data() + number_.size(), exact);
        number_.clear();
        if (!std::isfinite(exact)) {  // beyond the range: a number that nothing here can hold
            error = json::error::exponent_overflow;
            return false;
        }
        return stack_.push_double(exact), true;
    }
    bool on_bool(bool value, json::error_code&) { return stack_.push_bool(value), true; }
    bool on_null(json::error_code&) { return stack_.push_null(), true; }
    bool on_comment_part(json::string_view, json::error_code&) { return true; }
    bool on_comment(json::string_view, json::error_code&) { return true; }

  private:
    json::value_stack stack_;
    std::string number_;
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
    json::parse_options options;
    options.max_depth = static_cast<std::size_t>(maximumDepth);
    json::basic_parser<Builder> parser(options);
    json::error_code error;
    const std::size_t used = parser.write_some(false, text.data(), text.size(), error);
    if (error || used != text.size() || !parser.done()) return std::nullopt;
    return parser.handler().take();
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
