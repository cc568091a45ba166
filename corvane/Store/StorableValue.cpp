#include <corvane/Store/StorableValue.h>

#include <corvane/Platform/Bytes.h>
#include <corvane/Platform/Error.h>
#include <corvane/Platform/JSONText.h>
#include <corvane/Store/GrowingBlob.h>

#include <utility>

namespace corvane {

namespace {

struct LiteralAppender {
    std::string& out;

    void operator()(std::monostate) const { out += "NULL"; }

    void operator()(const std::string& text) const {
        if (text.find('\0') != std::string::npos) {
            throw InvalidArgument("text that holds NUL cannot be written into an SQL statement");
        }
        out += '\'';
        for (std::size_t start = 0;;) {
            const std::size_t quote = text.find('\'', start);
            if (quote == std::string::npos) {
                out.append(text, start);
                break;
            }
            out.append(text, start, quote + 1 - start) += '\'';
            start = quote + 1;
        }
        out += '\'';
    }

    void operator()(std::int64_t number) const { jsontext::appendInteger(out, number); }

    void operator()(double number) const {
        if (!jsontext::appendDouble(out, number)) {
            throw InvalidArgument("a number that is not finite cannot be stored");
        }
    }

    template <class Bytes>
    void operator()(const Bytes& value) const {
        out += "x'";
        appendHexDigits(out, value.bytes);
        out += '\'';
    }

    void operator()(const GrowingBlob* blob) const { blob->appendSQLLiteral(out); }
};

}  // namespace

StorableValue::StorableValue(std::string text) : value_(std::move(text)) {}
StorableValue::StorableValue(std::string_view text) : value_(std::string(text)) {}
StorableValue::StorableValue(const char* text) : value_(std::string(text)) {}
StorableValue::StorableValue(const std::optional<std::string>& text) {
    if (text) value_ = *text;
}

StorableValue StorableValue::bytes(std::string bytes) {
    StorableValue value;
    value.value_.emplace<Bytes>(Bytes{std::move(bytes)});
    return value;
}

StorableValue StorableValue::absent() {
    return {};
}

void StorableValue::appendSQLLiteral(std::string& out) const {
    std::visit(LiteralAppender{out}, value_);
}

std::string StorableValue::sqlLiteral() const {
    std::string literal;
    literal.reserve(sqlLiteralSizeHint());
    appendSQLLiteral(literal);
    return literal;
}

std::size_t StorableValue::sqlLiteralSizeHint() const noexcept {
    constexpr std::size_t numberSize = 26;
    if (const auto* blob = std::get_if<const GrowingBlob*>(&value_)) return (*blob)->sqlLiteralSize();
    if (const auto* bytes = std::get_if<Bytes>(&value_)) return 2 * bytes->bytes.size() + 3;
    if (const auto* text = std::get_if<std::string>(&value_)) return text->size() + 2;
    return numberSize;
}

}  // namespace corvane
