#include <corvane/Models/Encoder.h>

#include <corvane/Models/OwnJSON.h>

#include <utility>

namespace corvane {

namespace {

const char* describe(EncodingError::Code code) {
    switch (code) {
        case EncodingError::notUTF8:
            return "the text is not UTF-8";
        case EncodingError::notFinite:
            return "the number is infinite or not a number";
        case EncodingError::tooDeep:
            return "objects and arrays nest too deep";
        case EncodingError::malformed:
            return "what was encoded is not one JSON value";
        case EncodingError::outOfRange:
            return "the date is out of range";
    }
    return "cannot be encoded";
}

}  // namespace

EncodingError::EncodingError(Code code, std::string path)
    : Error("Corvane.EncodingError", code, (path.empty() ? "" : path + ": ") + describe(code)),
      path_(std::move(path)) {}
EncodingError::~EncodingError() = default;

EncodingError EncodingError::within(std::string_view name) const {
    return {value(), path_.empty() ? std::string(name) : std::string(name) + "." + path_};
}

// Most records fit, and the text does not move while it grows; take() gives back what a small one leaves.
Encoder::Encoder() {
    out_.reserve(240);
}

std::string Encoder::keyAt(int level) const {
    const std::size_t begin = keys_[level];
    if (begin == 0) return {};
    std::size_t end = begin + 1;
    while (out_[end] != '"') end += out_[end] == '\\' ? 2 : 1;
    return JSON(std::string_view(out_).substr(begin, end + 1 - begin)).string().value_or("");
}

void Encoder::fail(EncodingError::Code code) const {
    std::string path;
    for (int level = 1; level <= depth_; ++level) {
        if (isObject_[level]) {
            if (!path.empty()) path += '.';
            path += keyAt(level);
        } else {
            path += "[]";
        }
    }
    throw EncodingError(code, std::move(path));
}

void Encoder::beforeValue() {
    if (depth_ == 0 ? !out_.empty() : isObject_[depth_] != hasKey_) fail(EncodingError::malformed);
    if (needsComma_ && !hasKey_) out_ += ',';
    needsComma_ = true;
    hasKey_ = false;
}

void Encoder::begin(char bracket, bool isObject) {
    beforeValue();
    if (depth_ == jsontext::maximumDepth) fail(EncodingError::tooDeep);
    out_ += bracket;
    needsComma_ = false;
    isObject_[++depth_] = isObject;
    keys_[depth_] = 0;
}

void Encoder::end(char bracket, bool isObject) {
    if (depth_ == 0 || isObject_[depth_] != isObject || hasKey_) fail(EncodingError::malformed);
    out_ += bracket;
    --depth_;
    needsComma_ = true;
}

void Encoder::key(std::string_view name) {
    if (depth_ == 0 || !isObject_[depth_] || hasKey_) fail(EncodingError::malformed);
    if (needsComma_) out_ += ',';
    keys_[depth_] = out_.size();
    if (!jsontext::appendString(out_, name)) {
        out_ += "\"(key)\"";
        fail(EncodingError::notUTF8);
    }
    out_ += ':';
    hasKey_ = true;
}

void Encoder::string(std::string_view text) {
    beforeValue();
    if (!jsontext::appendString(out_, text)) fail(EncodingError::notUTF8);
}

void Encoder::integer(std::int64_t number) {
    beforeValue();
    jsontext::appendInteger(out_, number);
}

void Encoder::unsignedInteger(std::uint64_t number) {
    beforeValue();
    jsontext::appendUnsigned(out_, number);
}

void Encoder::real(double number) {
    beforeValue();
    if (!jsontext::appendDouble(out_, number)) fail(EncodingError::notFinite);
}

void Encoder::real(float number) {
    beforeValue();
    if (!jsontext::appendFloat(out_, number)) fail(EncodingError::notFinite);
}

void Encoder::boolean(bool value) {
    beforeValue();
    out_ += value ? "true" : "false";
}

void Encoder::null() {
    beforeValue();
    out_ += "null";
}

void Encoder::date(Date date) {
    integer(millisecondsSince1970(date));
}

void Encoder::date(long double milliseconds) {
    if (!(milliseconds > -0x1p63L && milliseconds < 0x1p63L)) {
        beforeValue();
        fail(EncodingError::outOfRange);
    }
    integer(static_cast<std::int64_t>(milliseconds));
}

void Encoder::json(const JSON& value) {
    const std::string& text = value.text();
    if (text.empty()) return null();
    beforeValue();
    if (depth_ + jsontext::nesting(text) > jsontext::maximumDepth) fail(EncodingError::tooDeep);
    if (!value.exists()) fail(EncodingError::malformed);
    out_ += text;
}

JSON Encoder::takeJSON() && {
    return OwnJSON::of(std::move(*this).take());
}

std::string Encoder::take() && {
    if (depth_ != 0 || out_.empty()) fail(EncodingError::malformed);
    if (out_.capacity() > 2 * out_.size()) out_.shrink_to_fit();
    return std::move(out_);
}

}  // namespace corvane
