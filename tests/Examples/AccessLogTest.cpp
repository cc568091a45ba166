#include <examples/replay/AccessLog.h>
#include <examples/replay/UTF8.h>

#include "tests/support/Testing.h"

namespace replay {
namespace {

using namespace std::chrono_literals;

std::optional<AccessLogEntry> parsedRequest(const std::string& request) {
    return parseAccessLogLine(R"(192.0.2.1 - - [10/Oct/2026:13:55:36 +0200] ")" + request + R"(" 200 1 "-" "-")");
}

std::optional<corvane::Date> parsedTime(const std::string& time) {
    const auto entry = parseAccessLogLine("192.0.2.1 - - [" + time + R"(] "GET / HTTP/1.1" 200 1 "-" "-")");
    return entry ? std::optional(entry->time) : std::nullopt;
}

TEST(AccessLog, ReadsEveryFieldAndIgnoresThoseAfterTheAgent) {
    const auto entry =
        parseAccessLogLine(R"(2001:db8::7 - a [x] b [10/Oct/2026:13:55:36 +0200] "GET /a/b?q=1?2 HTTP/1.1" 200 2326 )"
                           R"("https://example.com/" "Mozilla/5.0" "y" 0.01)");
    ASSERT_TRUE(entry);
    EXPECT_EQ(entry->address, "2001:db8::7");
    EXPECT_EQ(entry->user, "a [x] b");
    EXPECT_EQ(entry->time, std::chrono::sys_days(2026y / 10 / 10) + 11h + 55min + 36s);
    EXPECT_EQ(*entry->method + *entry->path + "?" + *entry->query, "GET/a/b?q=1?2");
    EXPECT_EQ(entry->status, 200);
    EXPECT_EQ(entry->bytes, 2326);
    EXPECT_EQ(*entry->referrer + " " + *entry->agent, "https://example.com/ Mozilla/5.0");
}

TEST(AccessLog, TimesOfAllZonesAreTheSameInstant) {
    const auto noon = std::chrono::sys_days(2026y / 2 / 28) + 12h;
    EXPECT_EQ(parsedTime("28/Feb/2026:12:00:00 +0000"), noon);
    EXPECT_EQ(parsedTime("28/Feb/2026:02:30:00 -0930"), noon);
    EXPECT_EQ(parsedTime("01/Mar/2026:02:00:00 +1400"), noon);
    EXPECT_EQ(parsedTime("31/Dec/2016:23:59:60 +0000"), std::chrono::sys_days(2017y / 1 / 1));
    EXPECT_EQ(parsedTime("31/Dec/1969:23:59:59 +0000"), corvane::Date(-1s));
}

TEST(AccessLog, RefusesTimesThatAreNone) {
    for (const std::string time :
         {"29/Feb/2026:12:00:00 +0000", "1/Jan/2026:12:00:00 +0000", "01/jan/2026:12:00:00 +0000",
          "01/Jan/2026:24:00:00 +0000", "01/Jan/2026:12:00:00 0000", "01/Jan/9999:12:00:00 +0000", ""}) {
        EXPECT_FALSE(parsedTime(time)) << time;
    }
}

TEST(AccessLog, SplitsRequests) {
    const struct {
        const char* request;
        std::optional<std::string> method, path, query, protocol;
    } cases[] = {
        {"GET /?", "GET", "/", "", {}},
        {"-", {}, {}, {}, {}},
        {"GET /two words HTTP/1.0", "GET", "/two words", {}, "HTTP/1.0"},
        {"get / HTTP/1.1", {}, "get / HTTP/1.1", {}, {}},
        {R"(GET /\"q\"\\\x41\t HTTP/1.1)", "GET", "/\"q\"\\A\t", {}, "HTTP/1.1"},
        {R"(GET /\xC3\xA9?\xff HTTP/1.1)", "GET", "/é", "\uFFFD", "HTTP/1.1"},
        {R"(GET /\q\xZZ HTTP/1.1)", "GET", R"(/\q\xZZ)", {}, "HTTP/1.1"},
    };
    for (const auto& [request, method, path, query, protocol] : cases) {
        const auto entry = parsedRequest(request);
        ASSERT_TRUE(entry) << request;
        EXPECT_TRUE(entry->method == method && entry->path == path && entry->query == query &&
                    entry->protocol == protocol)
            << request;
    }
}

TEST(AccessLog, RefusesLinesOfOtherFormats) {
    const std::string start = "192.0.2.1 - - [10/Oct/2026:13:55:36 +0200] ";
    for (const std::string& line :
         {std::string(), std::string("\0\0", 2), std::string("a"), std::string("a - - ["), start,
          start + R"("GET / HTTP/1.1" 200 1)", start + R"("GET / HTTP/1.1 200 1 "-" "-)",
          start + R"("GET / HTTP/1.1" 2000 1 "-" "-")", start + R"("GET / HTTP/1.1" 200 -1 "-" "-")",
          start + R"("GET / HTTP/1.1" 200 99999999999999999999 "-" "-")", start + R"("GET / HTTP/1.1" x 1 "-" "-")",
          start + R"("GET / HTTP/1.1" 200 1 "-" "-"x)", start + R"("GET / HTTP/1.1" 200 1 - -)", start + R"("\)",
          start + R"("\x4)", " " + start + R"("GET / HTTP/1.1" 200 1 "-" "-")"}) {
        EXPECT_FALSE(parseAccessLogLine(line)) << line;
    }
}

TEST(UTF8, BadSequencesAreReplaced) {
    const struct {
        const char* text;
        const char* expected;
    } cases[] = {
        {"plain é € 😀", "plain é € 😀"},
        {"\xFF-\x80-", "\uFFFD-\uFFFD-"},
        {"\xC0\xAF", "\uFFFD\uFFFD"},                      // overlong
        {"\xED\xA0\x80", "\uFFFD\uFFFD\uFFFD"},            // a surrogate
        {"\xF4\x90\x80\x80", "\uFFFD\uFFFD\uFFFD\uFFFD"},  // above U+10FFFF
        {"\xE2\x82-\xF0\x9F\x98", "\uFFFD-\uFFFD"},        // cut off
    };
    for (const auto& [text, expected] : cases) EXPECT_EQ(repairedUTF8(text), expected) << expected;
}

}  // namespace
}  // namespace replay
