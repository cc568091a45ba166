#include "text.h"

#include <corvane/Platform/JSONText.h>

#include <algorithm>
#include <array>
#include <cstdio>
#include <utility>

namespace inspect {

namespace {

// How many bytes the character has that the text begins with; 0 for none.
std::size_t characterLength(std::string_view text) {
    const auto first = static_cast<unsigned char>(text.front());
    const std::size_t length = first < 0x80 ? 1 : first < 0xE0 ? 2 : first < 0xF0 ? 3 : 4;
    return corvane::jsontext::isUTF8(text.substr(0, length)) && text.size() >= length ? length : 0;
}

// Control characters of both kinds, and what turns the direction of text or has no width.
bool isHarmless(std::string_view character) {
    const auto first = static_cast<unsigned char>(character.front());
    if (character.size() == 1) return first >= 0x20 && first != 0x7F;
    constexpr std::array<std::pair<std::string_view, std::string_view>, 6> harmful{{
        {"\xC2\x80", "\xC2\x9F"},
        {"\xC2\xAD", "\xC2\xAD"},
        {"\xD8\x9C", "\xD8\x9C"},
        {"\xE2\x80\x8B", "\xE2\x80\x8F"},
        {"\xE2\x80\xA8", "\xE2\x80\xAE"},
        {"\xE2\x81\xA0", "\xE2\x81\xAF"},
    }};
    return std::none_of(harmful.begin(), harmful.end(), [&](const auto& range) {
        return character.size() == range.first.size() && character >= range.first && character <= range.second;
    });
}

void appendEscaped(std::string& out, std::string_view bytes) {
    for (const char byte : bytes) {
        std::array<char, 8> escaped{};
        std::snprintf(escaped.data(), escaped.size(), "\\x%02x", static_cast<unsigned char>(byte));
        out += escaped.data();
    }
}

}  // namespace

std::string printable(std::string_view text) {
    std::string out;
    while (!text.empty()) {
        const std::size_t length = characterLength(text);
        const auto character = text.substr(0, std::max<std::size_t>(1, length));
        if (length > 0 && isHarmless(character)) {
            out += character;
        } else {
            appendEscaped(out, character);
        }
        text.remove_prefix(character.size());
    }
    return out;
}

std::string counted(std::uint64_t count, std::string_view what) {
    return std::to_string(count) + ' ' + std::string(what) + (count == 1 ? "" : "s");
}

std::string size(std::int64_t bytes) {
    constexpr std::array units{"B", "KiB", "MiB", "GiB", "TiB"};
    auto number = static_cast<double>(bytes);
    std::size_t unit = 0;
    while (number >= 1024 && unit + 1 < units.size()) {
        number /= 1024;
        ++unit;
    }
    std::array<char, 32> text{};
    std::snprintf(text.data(), text.size(), unit == 0 ? "%.0f %s" : "%.1f %s", number, units[unit]);
    return text.data();
}

std::string age(corvane::Date date) {
    const std::int64_t seconds = corvane::millisecondsBetween(date, corvane::now()) / 1000;
    if (seconds < 0) return "in the future";
    constexpr std::array<std::pair<std::int64_t, const char*>, 4> units{
        {{86400, " d"}, {3600, " h"}, {60, " min"}, {1, " s"}}};
    for (const auto& [length, name] : units) {
        if (seconds >= length) return std::to_string(seconds / length) + name;
    }
    return "0 s";
}

std::string indented(std::string_view json) {
    std::string out;
    std::size_t depth = 0;
    const auto breakLine = [&] { out.append(1, '\n').append(2 * depth, ' '); };
    for (std::size_t i = 0; i < json.size(); ++i) {
        const char c = json[i];
        if (c == '"') {
            const std::size_t begin = i++;
            while (i < json.size() && json[i] != '"') i += json[i] == '\\' ? 2 : 1;
            out += printable(json.substr(begin, i - begin + 1));
        } else if (c == '{' || c == '[') {
            out += c;
            const bool isEmpty = i + 1 < json.size() && json[i + 1] == c + 2;
            if (isEmpty) {
                out += json[++i];
            } else {
                ++depth;
                breakLine();
            }
        } else if (c == '}' || c == ']') {
            depth -= depth > 0;
            breakLine();
            out += c;
        } else if (c == ',') {
            out += c;
            breakLine();
        } else if (c == ':') {
            out += ": ";
        } else if (static_cast<unsigned char>(c) > ' ') {
            out += c;
        }
    }
    return out;
}

std::size_t width(std::string_view text) {
    return static_cast<std::size_t>(
        std::count_if(text.begin(), text.end(), [](char c) { return (static_cast<unsigned char>(c) & 0xC0) != 0x80; }));
}

}  // namespace inspect
