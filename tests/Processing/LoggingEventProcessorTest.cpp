#include <corvane/Processing/LoggingEventProcessor.h>

#include "tests/support/CapturedLog.h"

#include <gtest/gtest.h>

namespace corvane::test {
namespace {

using namespace std::chrono_literals;

std::string logged(const LoggingEventProcessorFormat& format, const ProcessEvent& event) {
    CapturedLog log;
    LoggingEventProcessor(format).process(event);
    return log.lines().at(0).message;
}

class Shouting final : public LoggingEventProcessorFormatterType {
  public:
    std::string format(const ProcessEvent& event) const override { return event.name() + "! %@ %ld"; }
};

TEST(LoggingEventProcessor, WritesEventsInTheFormChosen) {
    using Format = LoggingEventProcessorFormat;
    const ProcessEvent event("View", JSON(R"({"screen":{"name":"home","depth":1},"a":[true,null]})"), std::nullopt);
    EXPECT_EQ(logged(Format::default_(), event),
              R"(View -> ["screen": ["name": "home", "depth": 1], "a": [true, null]])");
    EXPECT_EQ(logged(Format::json({.sortedKeys = true}), event),
              R"(View -> {"a":[true,null],"screen":{"depth":1,"name":"home"}})");
    EXPECT_EQ(logged(Format::json({.prettyPrinted = true}), ProcessEvent("V", JSON(R"({"a":1})"), {})),
              "V -> {\n  \"a\": 1\n}");
    EXPECT_EQ(logged(Format::custom(std::make_shared<Shouting>()), event), "View! %@ %ld");
    const ProcessEvent nothing("View", JSON("broken"), std::nullopt);
    EXPECT_EQ(logged(Format::default_(), nothing), "View ~> nil");
    EXPECT_EQ(logged(Format::json(), nothing), "View ~> nil");
    for (const char* broken : {"{broken", "{\"a\":1e999}", "{\"a\":\"\xff\"}"}) {
        EXPECT_EQ(logged(Format::json(), ProcessEvent("V", JSON::fromEncodedText(broken), {})), "V ~> nil");
    }
}

TEST(LoggingEventProcessor, WritesSessionsAndGroupsAtDebugLevel) {
    CapturedLog log;
    LoggingEventProcessor processor;
    const Session session{"S", Session::Kind::userEvents(), Date(1500ms), JSON("{}")};
    processor.didStartSession(session);
    processor.didUpdateSession(session, true);
    processor.didEndSession(session, Date(61s));
    processor.didEnterGroup({"g", Date(0s)});
    processor.didLeaveGroup({"g", Date(0s)});
    std::vector<std::string> messages;
    for (const auto& line : log.lines()) {
        EXPECT_EQ(line.level, LogLevel::debug);
        messages.push_back(line.message);
    }
    EXPECT_EQ(messages, (std::vector<std::string>{
                            "Started session, identifier=S, startDate=1970-01-01 00:00:01 +0000, sessionData=[:]",
                            "Updated session, identifier=S, startDate=1970-01-01 00:00:01 +0000, sessionData=[:]",
                            "Ended session, identifier=S, startDate=1970-01-01 00:00:01 +0000, "
                            "endDate=1970-01-01 00:01:01 +0000, sessionData=[:]",
                            "Entering group, name=g startDate=1970-01-01 00:00:00 +0000", "Leaving group, name=g"}));
}

TEST(Log, HidesPrivateArgumentsWhenAskedAndKeepsPublicOnes) {
    CapturedLog log;
    Log::shared().setHidesPrivateArguments(true);
    Log::shared().error("a=%{public}@ b=%@ n=%ld 100%", "x", "secret", 7);
    Log::shared().setHidesPrivateArguments(false);
    EXPECT_TRUE(log.has(LogLevel::error, "a=x b=<private> n=7 100%"));
}

}  // namespace
}  // namespace corvane::test
