#include <corvane/Models/JSONParser.h>

#include <boost/json/basic_parser_impl.hpp>
#include <boost/json/object.hpp>

#include <charconv>
#include <cmath>
#include <string>

namespace corvane {

namespace {

namespace json = boost::json;

std::string_view view(json::string_view text) {
    return {text.data(), text.size()};
}

// The parser is a template of 35 KB of code, so there is one for all listeners. The library's own handler rounds some
// doubles to a neighbour, so a number would not come back as it was written; this one keeps the text of a number and
// converts it exactly.
class Handler {
  public:
    static constexpr std::size_t max_object_size = json::object::max_size();
    static constexpr std::size_t max_array_size = json::array::max_size();
    static constexpr std::size_t max_key_size = json::string::max_size();
    static constexpr std::size_t max_string_size = json::string::max_size();

    explicit Handler(JSONListener& listener) : listener_(listener) {}

    bool on_document_begin(json::error_code&) { return true; }
    bool on_document_end(json::error_code&) { return true; }
    bool on_object_begin(json::error_code&) { return listener_.beginObject(), true; }
    bool on_object_end(std::size_t count, json::error_code&) { return listener_.endObject(count), true; }
    bool on_array_begin(json::error_code&) { return listener_.beginArray(), true; }
    bool on_array_end(std::size_t count, json::error_code&) { return listener_.endArray(count), true; }
    bool on_key_part(json::string_view part, std::size_t, json::error_code&) {
        return listener_.keyPart(view(part)), true;
    }
    bool on_key(json::string_view part, std::size_t, json::error_code&) { return listener_.key(view(part)), true; }
    bool on_string_part(json::string_view part, std::size_t, json::error_code&) {
        return listener_.stringPart(view(part)), true;
    }
    bool on_string(json::string_view part, std::size_t, json::error_code&) {
        return listener_.string(view(part)), true;
    }
    bool on_number_part(json::string_view part, json::error_code&) {
        number_.append(part.data(), part.size());
        return true;
    }
    bool on_int64(std::int64_t number, json::string_view, json::error_code&) {
        number_.clear();
        return listener_.integer(number), true;
    }
    bool on_uint64(std::uint64_t number, json::string_view, json::error_code&) {
        number_.clear();
        return listener_.unsignedInteger(number), true;
    }
    bool on_double(double approximation, json::string_view part, json::error_code& error) {
        number_.append(part.data(), part.size());
        double exact = approximation;
        std::from_chars(number_.data(), number_.data() + number_.size(), exact);
        number_.clear();
        if (!std::isfinite(exact)) {  // beyond the range: no JSON reader agrees on what it is
            error = json::error::exponent_overflow;
            return false;
        }
        return listener_.number(exact), true;
    }
    bool on_bool(bool value, json::error_code&) { return listener_.boolean(value), true; }
    bool on_null(json::error_code&) { return listener_.null(), true; }
    bool on_comment_part(json::string_view, json::error_code&) { return true; }
    bool on_comment(json::string_view, json::error_code&) { return true; }

  private:
    JSONListener& listener_;
    std::string number_;
};

}  // namespace

bool parseJSON(std::string_view text, int maximumDepth, JSONListener& listener) {
    json::parse_options options;
    options.max_depth = static_cast<std::size_t>(maximumDepth);
    json::basic_parser<Handler> parser(options, listener);
    json::error_code error;
    const std::size_t used = parser.write_some(false, text.data(), text.size(), error);
    return !error && used == text.size() && parser.done();
}

}  // namespace corvane
