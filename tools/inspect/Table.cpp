#include "Table.h"

#include "text.h"

#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <stdexcept>
#include <string_view>

namespace inspect {

namespace {

// Cut before a character, with an ellipsis.
std::string cut(const std::string& text, std::size_t most) {
    if (width(text) <= most) return text;
    std::size_t end = 0, seen = 0;
    while (end < text.size()) {
        if ((static_cast<unsigned char>(text[end]) & 0xC0) != 0x80 && ++seen == most) break;
        ++end;
    }
    return text.substr(0, end) + "…";
}

}  // namespace

std::string Style::strong(const std::string& text) const {
    return hasColours ? "\x1b[1m" + text + "\x1b[0m" : text;
}

std::string Style::alarming(const std::string& text) const {
    return hasColours ? "\x1b[31m" + text + "\x1b[0m" : text;
}

Style Style::of(const std::string& colours) {
    if (colours != "auto" && colours != "always" && colours != "never") {
        throw std::invalid_argument("--color takes auto, always or never");
    }
    Style style;
    const bool isTerminal = ::isatty(STDOUT_FILENO) == 1;
    const char* const none = std::getenv("NO_COLOR");
    const char* const kind = std::getenv("TERM");
    const bool wants = isTerminal && !(none && *none) && !(kind && std::string_view(kind) == "dumb");
    style.hasColours = colours == "always" || (colours == "auto" && wants);
    winsize window{};
    if (isTerminal && ::ioctl(STDOUT_FILENO, TIOCGWINSZ, &window) == 0) style.columns = window.ws_col;
    return style;
}

void Table::print(std::ostream& out, const Style& style) const {
    if (rows_.empty()) return;
    std::vector<std::size_t> widths;
    for (const auto& column : columns_) widths.push_back(width(column.heading));
    for (const auto& row : rows_) {
        for (std::size_t i = 0; i < row.size(); ++i) widths[i] = std::max(widths[i], width(row[i]));
    }
    const auto printRow = [&](const std::vector<std::string>& row, bool isHeading) {
        std::size_t used = 0;
        for (std::size_t i = 0; i < row.size(); ++i) {
            std::string cell = row[i];
            const bool isLast = i + 1 == row.size();
            // A column of less than this is no help.
            constexpr std::size_t least = 16;
            if (isLast && style.columns > used + least) cell = cut(cell, style.columns - used - 1);
            const std::string padding(widths[i] - std::min(widths[i], width(cell)), ' ');
            used += widths[i] + 2;
            if (isHeading) cell = style.strong(cell);
            out << (columns_[i].isNumber ? padding + cell : isLast ? cell : cell + padding) << (isLast ? "\n" : "  ");
        }
    };
    std::vector<std::string> headings;
    for (const auto& column : columns_) headings.push_back(column.heading);
    printRow(headings, true);
    for (const auto& row : rows_) printRow(row, false);
}

}  // namespace inspect
