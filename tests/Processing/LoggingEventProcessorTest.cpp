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
    const ProcessEvent event("View", JSON(R"({"screen":{"name":"home"},"a":[true,null]})"), std::nullopt);
    EXPECT_EQ(logged(Format::default_(), event), R"(View -> ["screen": ["name": "home"], "a": [true, null]])");
    EXPECT_EQ(
        logged(Format::json({.prettyPrinted = true, .sortedKeys = true}), ProcessEvent("V", JSON(R"({"a":1})"), {})),
        "V -> {\n  \"a\": 1\n}");
    EXPECT_EQ(logged(Format::custom(std::make_shared<Shouting>()), event), "View! %@ %ld");
    EXPECT_EQ(logged(Format::default_(), ProcessEvent("View", JSON("broken"), {})), "View ~> nil");
    for (const char* broken : {"{broken", "{\"a\":1e999}", "{\"a\":\"\xff\"}"}) {
        EXPECT_EQ(logged(Format::json(), ProcessEvent("V", JSON::fromEncodedText(broken), {})), "V ~> nil");
    }
}

}  // namespace
}  // namespace corvane::test
