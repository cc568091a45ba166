#include <corvane/Processing/LoggingEventProcessor.h>

#include "tests/support/Testing.h"

namespace corvane::test {
namespace {

std::string logged(const LoggingEventProcessorFormat& format, const ProcessEvent& event) {
    CapturedLog log;
    LoggingEventProcessor(format).process(event);
    return log.lines().at(0).message;
}

struct Shouting final : LoggingEventProcessorFormatterType {
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

TEST(Log, HidesPrivateArgumentsWhenAskedAndKeepsPublicOnes) {
    CapturedLog log;
    Log::shared().setHidesPrivateArguments(true);
    Log::shared().error("a=%{public}@ b=%@ n=%ld 100%", "x", "secret", 7);
    Log::shared().setHidesPrivateArguments(false);
    EXPECT_TRUE(log.has(LogLevel::error, "a=x b=<private> n=7 100%"));
}

}  // namespace
}  // namespace corvane::test
