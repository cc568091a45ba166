#include "AccessLog.h"

#include "UTF8.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <chrono>
#include <utility>

namespace replay {

namespace {

bool isDigit(char c) {
    return c >= '0' && c <= '9';
}

/// Takes a line apart from the left. Every `take` moves past what it returns, or fails and leaves the place undefined.
class Scanner {
  public:
    explicit Scanner(std::string_view text) : rest_(text) {}

    [[nodiscard]] bool isAtEnd() const { return rest_.empty(); }
    [[nodiscard]] bool isAt(char c) const { return rest_.starts_with(c); }

    bool take(char c) {
        if (!isAt(c)) return false;
        rest_.remove_prefix(1);
        return true;
    }
    /// One or more characters up to a blank or the end.
    std::optional<std::string_view> takeWord() {
        const auto word = rest_.substr(0, rest_.find(' '));
        if (word.empty()) return std::nullopt;
        rest_.remove_prefix(word.size());
        return word;
    }
    /// Exactly `count` digits.
    std::optional<int> takeDigits(std::size_t count) {
        if (rest_.size() < count || !std::ranges::all_of(rest_.substr(0, count), isDigit)) return std::nullopt;
        int number = 0;
        for (const char digit : rest_.substr(0, count)) number = number * 10 + (digit - '0');
        rest_.remove_prefix(count);
        return number;
    }
    std::optional<std::string_view> takeCharacters(std::size_t count) {
        if (rest_.size() < count) return std::nullopt;
        const auto characters = rest_.substr(0, count);
        rest_.remove_prefix(count);
        return characters;
    }
    /// A field in quotes, its escapes undone.
    std::optional<std::string> takeQuoted();

    [[nodiscard]] std::string_view rest() const { return rest_; }

  private:
    void takeEscape(std::string& out);

    std::string_view rest_;
};

std::optional<int> hexDigit(char c) {
    if (isDigit(c)) return c - '0';
    if (c >= 'a' && c <= 'f') return c - 'a' + 10;
    if (c >= 'A' && c <= 'F') return c - 'A' + 10;
    return std::nullopt;
}

// After the backslash.
void Scanner::takeEscape(std::string& out) {
    constexpr std::string_view letters = "\"\\nrtvbf";
    constexpr std::string_view meanings = "\"\\\n\r\t\v\b\f";
    const char c = rest_.front();
    if (const std::size_t letter = letters.find(c); letter != std::string_view::npos) {
        out += meanings[letter];
        rest_.remove_prefix(1);
        return;
    }
    if (c == 'x' && rest_.size() >= 3) {
        const auto high = hexDigit(rest_[1]);
        const auto low = hexDigit(rest_[2]);
        if (high && low) {
            out += static_cast<char>(*high * 16 + *low);
            rest_.remove_prefix(3);
            return;
        }
    }
    out += '\\';
}

std::optional<std::string> Scanner::takeQuoted() {
    if (!take('"')) return std::nullopt;
    std::string field;
    while (!rest_.empty()) {
        const char c = rest_.front();
        rest_.remove_prefix(1);
        if (c == '"') return field;
        if (c == '\\' && !rest_.empty()) {
            takeEscape(field);
        } else {
            field += c;
        }
    }
    return std::nullopt;  // never closed
}

std::optional<std::string> textOrNothing(std::string_view field) {
    if (field.empty() || field == "-") return std::nullopt;
    return repairedUTF8(field);
}

std::optional<std::chrono::month> monthNamed(std::string_view name) {
    constexpr std::array<std::string_view, 12> names = {"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                                                        "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};
    const auto* const found = std::ranges::find(names, name);
    if (found == names.end()) return std::nullopt;
    return std::chrono::month(static_cast<unsigned>(found - names.begin()) + 1);
}

std::optional<std::chrono::sys_days> takeDay(Scanner& scanner) {
    const auto day = scanner.takeDigits(2);
    if (!day || !scanner.take('/')) return std::nullopt;
    const auto monthName = scanner.takeCharacters(3);
    const auto month = monthName ? monthNamed(*monthName) : std::nullopt;
    if (!month || !scanner.take('/')) return std::nullopt;
    const auto year = scanner.takeDigits(4);
    if (!year) return std::nullopt;
    const std::chrono::year_month_day date(std::chrono::year(*year), *month,
                                           std::chrono::day(static_cast<unsigned>(*day)));
    if (!date.ok()) return std::nullopt;
    return std::chrono::sys_days(date);
}

std::optional<std::chrono::seconds> takeTimeOfDay(Scanner& scanner) {
    const auto hours = scanner.takeDigits(2);
    if (!hours || *hours > 23 || !scanner.take(':')) return std::nullopt;
    const auto minutes = scanner.takeDigits(2);
    if (!minutes || *minutes > 59 || !scanner.take(':')) return std::nullopt;
    const auto seconds = scanner.takeDigits(2);
    if (!seconds || *seconds > 60) return std::nullopt;  // 60 in a leap second
    return std::chrono::hours(*hours) + std::chrono::minutes(*minutes) + std::chrono::seconds(*seconds);
}

// East of Greenwich: "+0200".
std::optional<std::chrono::seconds> takeZone(Scanner& scanner) {
    const bool isWest = scanner.isAt('-');
    if (!scanner.take(isWest ? '-' : '+')) return std::nullopt;
    const auto hours = scanner.takeDigits(2);
    const auto minutes = scanner.takeDigits(2);
    if (!hours || *hours > 23 || !minutes || *minutes > 59) return std::nullopt;
    const std::chrono::seconds offset = std::chrono::hours(*hours) + std::chrono::minutes(*minutes);
    return isWest ? -offset : offset;
}

// "[10/Oct/2026:13:55:36 +0200]".
std::optional<corvane::Date> takeTime(Scanner& scanner) {
    if (!scanner.take('[')) return std::nullopt;
    const auto day = takeDay(scanner);
    if (!day || !scanner.take(':')) return std::nullopt;
    const auto time = takeTimeOfDay(scanner);
    if (!time || !scanner.take(' ')) return std::nullopt;
    const auto zone = takeZone(scanner);
    if (!zone || !scanner.take(']')) return std::nullopt;
    const std::chrono::sys_seconds instant = *day + *time - *zone;
    return corvane::dateFromMilliseconds(std::chrono::milliseconds(instant.time_since_epoch()).count());
}

// User names may hold blanks and brackets: the name ends where a time begins.
bool takeUserAndTime(Scanner& scanner, AccessLogEntry& entry) {
    const std::string_view text = scanner.rest();
    for (std::size_t end = text.find(" ["); end != std::string_view::npos; end = text.find(" [", end + 1)) {
        Scanner afterUser(text.substr(end + 1));
        const auto time = takeTime(afterUser);
        if (!time) continue;
        const auto user = text.substr(0, end);
        entry.user = user == "\"\"" ? std::nullopt : textOrNothing(user);
        entry.time = *time;
        scanner = afterUser;
        return end > 0;
    }
    return false;
}

bool isMethod(std::string_view word) {
    return !word.empty() && std::ranges::all_of(word, [](char c) { return (c >= 'A' && c <= 'Z') || c == '-'; });
}

void splitRequest(std::string_view request, AccessLogEntry& entry) {
    entry.path = textOrNothing(request);
    const std::size_t blank = request.find(' ');
    if (blank == std::string_view::npos || !isMethod(request.substr(0, blank))) return;  // not HTTP

    std::string_view target = request.substr(blank + 1);
    const std::size_t last = target.rfind(' ');
    if (last != std::string_view::npos && target.substr(last + 1).starts_with("HTTP/")) {
        entry.protocol = repairedUTF8(target.substr(last + 1));
        target = target.substr(0, last);
    }
    entry.method = std::string(request.substr(0, blank));
    const std::size_t mark = target.find('?');
    entry.path = repairedUTF8(target.substr(0, mark));
    if (mark != std::string_view::npos) entry.query = repairedUTF8(target.substr(mark + 1));
}

// A number without a sign, or "-" for nothing. Returns whether it was one of them.
template <class N>
bool takeNumber(Scanner& scanner, std::optional<N>& number) {
    const auto word = scanner.takeWord();
    if (!word) return false;
    if (*word == "-") return true;
    N value = 0;
    const char* const end = word->data() + word->size();
    const auto [rest, error] = std::from_chars(word->data(), end, value);
    if (error != std::errc() || rest != end || value < 0) return false;
    number = value;
    return true;
}

}  // namespace

std::optional<AccessLogEntry> parseAccessLogLine(std::string_view line) {
    Scanner scanner(line);
    AccessLogEntry entry;
    const auto address = scanner.takeWord();
    if (!address || !scanner.take(' ')) return std::nullopt;
    entry.address = repairedUTF8(*address);
    if (!scanner.takeWord() || !scanner.take(' ')) return std::nullopt;  // ident: nobody fills it in
    if (!takeUserAndTime(scanner, entry) || !scanner.take(' ')) return std::nullopt;

    const auto request = scanner.takeQuoted();
    if (!request || !scanner.take(' ')) return std::nullopt;
    splitRequest(*request, entry);
    if (!takeNumber(scanner, entry.status) || entry.status.value_or(0) > 999 || !scanner.take(' ')) return std::nullopt;
    if (!takeNumber(scanner, entry.bytes) || !scanner.take(' ')) return std::nullopt;

    const auto referrer = scanner.takeQuoted();
    if (!referrer || !scanner.take(' ')) return std::nullopt;
    const auto agent = scanner.takeQuoted();
    if (!agent || !(scanner.isAtEnd() || scanner.isAt(' '))) return std::nullopt;
    entry.referrer = textOrNothing(*referrer);
    entry.agent = textOrNothing(*agent);
    return entry;
}

}  // namespace replay
