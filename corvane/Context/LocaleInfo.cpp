#include <corvane/Context/Surroundings.h>

#include <algorithm>
#include <ctime>

namespace corvane {

namespace {

bool isUpper(char c) {
    return c >= 'A' && c <= 'Z';
}
bool isLower(char c) {
    return c >= 'a' && c <= 'z';
}
bool isDigit(char c) {
    return c >= '0' && c <= '9';
}

template <class IsAllowed>
bool consistsOf(std::string_view text, std::size_t least, std::size_t most, IsAllowed isAllowed) {
    return text.size() >= least && text.size() <= most && std::all_of(text.begin(), text.end(), isAllowed);
}

// "de_AT.UTF-8@euro": a language, a region, and what nobody needs here.
void setLanguage(LocaleInfo& locale, std::string_view name) {
    name = name.substr(0, name.find_first_of(".@"));
    const auto line = std::min(name.find('_'), name.size());
    const std::string_view language = name.substr(0, line), region = name.substr(std::min(line + 1, name.size()));
    if (!consistsOf(language, 2, 3, isLower)) return;
    locale.language = language;
    if (consistsOf(region, 2, 2, isUpper) || consistsOf(region, 3, 3, isDigit)) locale.region = region;
}

// Only names of the common database: a rule of somebody's own, as "XYZ-3:17", would single him out.
std::optional<std::string> zoneName(std::string_view text) {
    if (const auto database = text.rfind("zoneinfo/"); database != std::string_view::npos) {
        text.remove_prefix(database + std::string_view("zoneinfo/").size());
    }
    const auto isAllowed = [](char c) {
        return isUpper(c) || isLower(c) || isDigit(c) || c == '/' || c == '_' || c == '-' || c == '+';
    };
    const bool isName = text == "UTC" || text.find('/') != std::string_view::npos;
    if (!isName || !isUpper(text.front()) || !consistsOf(text, 3, 64, isAllowed)) return std::nullopt;
    return std::string(text);
}

std::optional<std::string> timeZone(const detail::Surroundings& around) {
    if (const auto chosen = around.variable("TZ")) {
        return zoneName(chosen->front() == ':' ? std::string_view(*chosen).substr(1) : std::string_view(*chosen));
    }
    if (const auto target = around.link("etc/localtime")) {
        if (auto zone = zoneName(*target)) return zone;
    }
    const std::string file = around.file("etc/timezone").value_or("");
    return zoneName(std::string_view(file).substr(0, file.find('\n')));
}

std::optional<std::int64_t> offsetFromUTC() {
    const std::time_t time = std::time(nullptr);
    std::tm local{};
    if (!::localtime_r(&time, &local)) return std::nullopt;
    return local.tm_gmtoff / 60;
}

}  // namespace

LocaleInfo detail::locale(const Surroundings& around) {
    LocaleInfo locale;
    for (const char* name : {"LC_ALL", "LC_MESSAGES", "LANG"}) {
        if (const auto value = around.variable(name)) {
            setLanguage(locale, *value);
            break;  // the first one that is set counts, whatever it says
        }
    }
    locale.timeZone = timeZone(around);
    return locale;
}

LocaleInfo LocaleInfo::current() {
    LocaleInfo locale = detail::locale({});
    locale.utcOffset = offsetFromUTC();
    return locale;
}

}  // namespace corvane
