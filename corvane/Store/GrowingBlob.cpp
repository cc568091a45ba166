#include <corvane/Store/GrowingBlob.h>

#include <corvane/Platform/Bytes.h>

namespace corvane {

namespace {

constexpr std::size_t openingSize = 2;  // x'
constexpr std::size_t closingSize = 1;  // '

}  // namespace

GrowingBlob::GrowingBlob(std::string_view prefix, std::string_view suffix) : literal_("x'") {
    appendHexDigits(literal_, prefix);
    appendHexDigits(suffix_, suffix);
    suffix_ += '\'';
}

void GrowingBlob::append(std::string_view bytes) {
    appendHexDigits(literal_, bytes);
}

std::size_t GrowingBlob::size() const noexcept {
    return (literal_.size() - openingSize + suffix_.size() - closingSize) / 2;
}

void GrowingBlob::appendSQLLiteral(std::string& out) const {
    out.append(literal_).append(suffix_);
}

}  // namespace corvane
