#include <corvane/Models/Client.h>
#include <corvane/Models/Decoding.h>
#include <corvane/Models/EventData.h>
#include <corvane/Models/SessionData.h>

#include "tests/support/Testing.h"

namespace corvane {
namespace {

using namespace std::chrono_literals;

TEST(TimedData, CountsWholeMillisecondsOfAnyDuration) {
    const Date start(10h);
    EXPECT_EQ(toDict(TimedData(start, start + 1234500us)).text(),
              R"({"startTimestamp":36000000,"endTimestamp":36001234,"duration":1234})");
    EXPECT_EQ(TimedData(Date::min(), Date::max()).duration, 18446744073708) << "wider than a duration holds";
    EXPECT_EQ(decode<TimedData>(toDict(TimedData(start, start + 2s))).duration, 2000);
}

TEST(Client, ComesFromABundleOrNotAtAll) {
    test::CapturedLog log;
    const auto client = [](const char* build) {
        return Client::fromBundle(Bundle({{"BundleIdentifier", "com.example.app"},
                                          {"BundleName", "App"},
                                          {"BundleShortVersionString", "2.3"},
                                          {"BundleVersion", build}}));
    };
    EXPECT_EQ(client("1234.5.6")->build(), 1234);
    EXPECT_EQ(client("abc")->build(), 0);
    EXPECT_EQ(client("77")->fullVersion(), "2.3.77");
    EXPECT_FALSE(Client::fromBundle(Bundle()));
    EXPECT_EQ(log.count("Failed to make a client"), 1);
    for (const std::string& bad : {std::string("a\0b", 3), std::string("a\rb"), std::string("a\nX-Y: b")}) {
        EXPECT_THROW(Client(bad, "App", "1", 1), InvalidArgument);
        EXPECT_THROW(Client("com.example.app", bad, "1", 1), InvalidArgument);
        EXPECT_THROW(Client("com.example.app", "App", bad, 1), InvalidArgument);
    }
}

}  // namespace
}  // namespace corvane
