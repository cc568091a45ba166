#include <corvane/Platform/JSONText.h>

#include <array>
#include <charconv>
#include <cmath>
#include <cstring>

namespace corvane::jsontext {

namespace {

enum Kind : unsigned char { plain, escaped, control, multibyte };

constexpr std::array<Kind, 256> kinds = [] {
    std::array<Kind, 256> table{};
    for (int c = 0; c < 256; ++c) table[c] = c < 0x20 ? control : c >= 0x80 ? multibyte : plain;
    table['"'] = table['\\'] = escaped;
    return table;
}();

// Where the plain bytes from `s` on end. Eight at a time: a byte below 0x20, a quote or a backslash borrows into the
// highest bit when 0x20, or 1 after it was made 0, is taken from it; one beyond ASCII has that bit itself.
const unsigned char* endOfPlain(const unsigned char* s, const unsigned char* end) {
    constexpr std::uint64_t ones = 0x0101010101010101, highest = 0x8080808080808080;
    for (; end - s >= 8; s += 8) {
        std::uint64_t bytes = 0;
        std::memcpy(&bytes, s, sizeof bytes);
        const std::uint64_t special =
            bytes | (bytes - ones * 0x20) | ((bytes ^ (ones * '"')) - ones) | ((bytes ^ (ones * '\\')) - ones);
        if (special & highest) break;
    }
    while (s != end && kinds[*s] == plain) ++s;
    return s;
}

bool isContinuation(unsigned char c) {
    return (c & 0xC0) == 0x80;
}

// The length of the well-formed multi-byte sequence at `s`, or 0: overlong forms, surrogates and code points beyond
// U+10FFFF are not well formed.
std::size_t sequenceLength(const unsigned char* s, const unsigned char* end) {
    const auto available = end - s;
    if (s[0] >= 0xC2 && s[0] <= 0xDF) return available >= 2 && isContinuation(s[1]) ? 2 : 0;
    if ((s[0] & 0xF0) == 0xE0) {
        if (available < 3 || !isContinuation(s[1]) || !isContinuation(s[2])) return 0;
        if (s[0] == 0xE0 && s[1] < 0xA0) return 0;
        if (s[0] == 0xED && s[1] > 0x9F) return 0;
        return 3;
    }
    if (s[0] >= 0xF0 && s[0] <= 0xF4) {
        if (available < 4 || !isContinuation(s[1]) || !isContinuation(s[2]) || !isContinuation(s[3])) return 0;
        if (s[0] == 0xF0 && s[1] < 0x90) return 0;
        if (s[0] == 0xF4 && s[1] > 0x8F) return 0;
        return 4;
    }
    return 0;
}

void appendControl(std::string& out, unsigned char c) {
    switch (c) {
        case '\b':
            out += "\\b";
            return;
        case '\f':
            out += "\\f";
            return;
        case '\n':
            out += "\\n";
            return;
        case '\r':
            out += "\\r";
            return;
        case '\t':
            out += "\\t";
            return;
        default:
            break;
    }
    constexpr char digits[] = "0123456789abcdef";
    const char text[] = {'\\', 'u', '0', '0', digits[c >> 4], digits[c & 0xF]};
    out.append(text, sizeof text);
}

template <class Number>
void appendChars(std::string& out, Number number) {
    char buffer[32];
    const auto end = std::to_chars(buffer, buffer + sizeof buffer, number).ptr;
    out.append(buffer, static_cast<std::size_t>(end - buffer));
}

template <class Number>
bool appendReal(std::string& out, Number number) {
    if (!std::isfinite(number)) return false;
    const std::size_t start = out.size();
    appendChars(out, number);
    if (std::string_view(out).substr(start).find_first_of(".e") == std::string_view::npos) out += ".0";
    return true;
}

}  // namespace

bool appendString(std::string& out, std::string_view text) {
    const std::size_t rollback = out.size();
    const auto* s = reinterpret_cast<const unsigned char*>(text.data());
    const auto* const end = s + text.size();
    out += '"';
    while (s != end) {
        const auto* run = s;
        s = endOfPlain(s, end);
        out.append(reinterpret_cast<const char*>(run), static_cast<std::size_t>(s - run));
        if (s == end) break;
        switch (kinds[*s]) {
            case escaped: {
                const char pair[] = {'\\', static_cast<char>(*s++)};
                out.append(pair, 2);
                break;
            }
            case control:
                appendControl(out, *s++);
                break;
            default: {
                const std::size_t length = sequenceLength(s, end);
                if (length == 0) {
                    out.resize(rollback);
                    return false;
                }
                out.append(reinterpret_cast<const char*>(s), length);
                s += length;
            }
        }
    }
    out += '"';
    return true;
}

bool isUTF8(std::string_view text) {
    const auto* s = reinterpret_cast<const unsigned char*>(text.data());
    const auto* const end = s + text.size();
    for (;;) {
        s = endOfPlain(s, end);
        if (s == end) return true;
        const std::size_t length = *s < 0x80 ? 1 : sequenceLength(s, end);
        if (length == 0) return false;
        s += length;
    }
}

bool appendDouble(std::string& out, double number) {
    return appendReal(out, number);
}
bool appendFloat(std::string& out, float number) {
    return appendReal(out, number);
}
void appendInteger(std::string& out, std::int64_t number) {
    appendChars(out, number);
}
void appendUnsigned(std::string& out, std::uint64_t number) {
    appendChars(out, number);
}

int nesting(std::string_view text) {
    int depth = 0;
    int deepest = 0;
    bool inString = false;
    for (std::size_t i = 0; i < text.size(); ++i) {
        switch (text[i]) {
            case '"':
                inString = !inString;
                break;
            case '\\':
                ++i;
                break;
            case '{':
            case '[':
                if (!inString && ++depth > deepest) deepest = depth;
                break;
            case '}':
            case ']':
                if (!inString) --depth;
                break;
            default:
                break;
        }
    }
    return deepest;
}

}  // namespace corvane::jsontext
