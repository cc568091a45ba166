#include <examples/replay/AccessLog.h>
#include <examples/replay/UTF8.h>

#include <gtest/gtest.h>

#include <string>

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

TEST(AccessLog, ReadsEveryField) {
    const auto entry =
        parseAccessLogLine(R"(2001:db8::7 - alice [10/Oct/2026:13:55:36 +0200] "GET /a/b?q=1?2 HTTP/1.1" 200 2326 )"
                           R"("https://example.com/" "Mozilla/5.0")");
    ASSERT_TRUE(entry);
    EXPECT_EQ(entry->address, "2001:db8::7");
    EXPECT_EQ(entry->user, "alice");
    EXPECT_EQ(entry->time, std::chrono::sys_days(2026y / 10 / 10) + 11h + 55min + 36s);
    EXPECT_EQ(entry->method, "GET");
    EXPECT_EQ(entry->path, "/a/b");
    EXPECT_EQ(entry->query, "q=1?2");
    EXPECT_EQ(entry->protocol, "HTTP/1.1");
    EXPECT_EQ(entry->status, 200);
    EXPECT_EQ(entry->bytes, 2326);
    EXPECT_EQ(entry->referrer, "https://example.com/");
    EXPECT_EQ(entry->agent, "Mozilla/5.0");
}

TEST(AccessLog, WhatIsLeftOutIsNothing) {
    const auto entry = parseAccessLogLine(R"(host.example.com - - [10/Oct/2026:13:55:36 +0200] "-" - - "-" "")");
    ASSERT_TRUE(entry);
    EXPECT_EQ(entry->address, "host.example.com");
    EXPECT_FALSE(entry->user || entry->method || entry->path || entry->query || entry->protocol);
    EXPECT_FALSE(entry->status || entry->bytes || entry->referrer || entry->agent);
}

TEST(AccessLog, UserNamesMayHoldBlanksAndBrackets) {
    const struct {
        std::string user;
        std::optional<std::string> expected;
    } cases[] = {{"alice smith", "alice smith"}, {"a [x] b", "a [x] b"}, {"\"\"", std::nullopt}, {"-", std::nullopt}};
    for (const auto& [user, expected] : cases) {
        const auto entry = parseAccessLogLine("192.0.2.1 id " + user +
                                              R"( [10/Oct/2026:13:55:36 +0200] "GET / HTTP/1.1" 200 1 "-" "-")");
        ASSERT_TRUE(entry) << user;
        EXPECT_EQ(entry->user, expected);
    }
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
         {"29/Feb/2026:12:00:00 +0000", "00/Jan/2026:12:00:00 +0000", "1/Jan/2026:12:00:00 +0000",
          "01/jan/2026:12:00:00 +0000", "01/Jan/2026:24:00:00 +0000", "01/Jan/2026:12:60:00 +0000",
          "01/Jan/2026:12:00:61 +0000", "01/Jan/2026:12:00:00 0000", "01/Jan/2026:12:00:00 +000",
          "01/Jan/2026:12:00:00", "01/Jan/9999:12:00:00 +0000", "01/Jan/2026 12:00:00 +0000", ""}) {
        EXPECT_FALSE(parsedTime(time)) << time;
    }
}

TEST(AccessLog, SplitsRequests) {
    const struct {
        const char* request;
        std::optional<std::string> method, path, query, protocol;
    } cases[] = {
        {"GET / HTTP/1.1", "GET", "/", {}, "HTTP/1.1"},
        {"GET /?", "GET", "/", "", {}},
        {"GET /two words HTTP/1.0", "GET", "/two words", {}, "HTTP/1.0"},
        {"M-SEARCH * HTTP/1.1", "M-SEARCH", "*", {}, "HTTP/1.1"},
        {"hello", {}, "hello", {}, {}},
        {"get / HTTP/1.1", {}, "get / HTTP/1.1", {}, {}},
        {R"(\x16\x03\x01)", {}, "\x16\x03\x01", {}, {}},
        {R"(GET /\"q\"\\\x41\t HTTP/1.1)", "GET", "/\"q\"\\A\t", {}, "HTTP/1.1"},
        {R"(GET /\xC3\xA9?\xff HTTP/1.1)", "GET", "/é", "\uFFFD", "HTTP/1.1"},
        {R"(GET /\q\xZZ HTTP/1.1)", "GET", R"(/\q\xZZ)", {}, "HTTP/1.1"},
    };
    for (const auto& c : cases) {
        const auto entry = parsedRequest(c.request);
        ASSERT_TRUE(entry) << c.request;
        EXPECT_EQ(entry->method, c.method) << c.request;
        EXPECT_EQ(entry->path, c.path) << c.request;
        EXPECT_EQ(entry->query, c.query) << c.request;
        EXPECT_EQ(entry->protocol, c.protocol) << c.request;
    }
}

TEST(AccessLog, IgnoresFieldsAfterTheAgent) {
    EXPECT_TRUE(parseAccessLogLine(R"(a - - [10/Oct/2026:13:55:36 +0200] "GET / HTTP/1.1" 200 1 "-" "x" "y" 0.01)"));
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
