#include <corvane/Models/JSONShape.h>

#include <boost/json/basic_parser_impl.hpp>

#include <cmath>
#include <string>

namespace corvane::jsonshape {

namespace {

namespace json = boost::json;

// Counts what the parser reports; nothing is kept of it.
class Counter {
  public:
    static constexpr std::size_t max_object_size = static_cast<std::size_t>(-1);
    static constexpr std::size_t max_array_size = static_cast<std::size_t>(-1);
    static constexpr std::size_t max_key_size = static_cast<std::size_t>(-1);
    static constexpr std::size_t max_string_size = static_cast<std::size_t>(-1);

    bool on_document_begin(json::error_code&) { return true; }
    bool on_document_end(json::error_code&) { return true; }
    bool on_object_begin(json::error_code&) {
        if (depth_ == elements) ++objects_;
        ++depth_;
        return true;
    }
    bool on_object_end(std::size_t, json::error_code&) { return --depth_, true; }
    bool on_array_begin(json::error_code&) { return beginOther(), ++depth_, true; }
    bool on_array_end(std::size_t, json::error_code&) { return --depth_, true; }
    bool on_key_part(json::string_view, std::size_t, json::error_code&) { return true; }
    bool on_key(json::string_view, std::size_t, json::error_code&) {
        if (depth_ == 1) ++keys_;
        return true;
    }
    bool on_string_part(json::string_view, std::size_t, json::error_code&) { return true; }
    bool on_string(json::string_view, std::size_t, json::error_code&) { return beginOther(), true; }
    bool on_number_part(json::string_view, json::error_code&) { return true; }
    bool on_int64(std::int64_t, json::string_view, json::error_code&) { return beginOther(), true; }
    bool on_uint64(std::uint64_t, json::string_view, json::error_code&) { return beginOther(), true; }
    bool on_double(double number, json::string_view, json::error_code&) {
        beginOther();
        if (std::isinf(number)) isExact_ = false;  // beyond the range: no JSON reader agrees on what it is
        return true;
    }
    bool on_bool(bool, json::error_code&) { return beginOther(), true; }
    bool on_null(json::error_code&) { return beginOther(), true; }
    bool on_comment_part(json::string_view, json::error_code&) { return true; }
    bool on_comment(json::string_view, json::error_code&) { return true; }

    [[nodiscard]] std::optional<std::size_t> objects() const {
        if (!isExact_ || keys_ != 1) return std::nullopt;
        return objects_;
    }

  private:
    static constexpr int elements = 2;  // the depth at which the array's elements stand

    void beginOther() {
        if (depth_ == elements) isExact_ = false;
    }

    int depth_ = 0;
    std::size_t keys_ = 0;  // of the outermost object
    std::size_t objects_ = 0;
    bool isExact_ = true;
};

}  // namespace

std::optional<std::size_t> objectsBetween(std::string_view text, std::string_view opening, std::string_view closing) {
    if (text.size() < opening.size() + closing.size() || !text.starts_with(opening) || !text.ends_with(closing)) {
        return std::nullopt;
    }
    json::parse_options options;
    options.max_depth = 512;
    json::basic_parser<Counter> parser(options);
    json::error_code error;
    const std::size_t used = parser.write_some(false, text.data(), text.size(), error);
    if (error || used != text.size() || !parser.done()) return std::nullopt;
    return parser.handler().objects();
}

}  // namespace corvane::jsonshape
