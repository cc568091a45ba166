#include <gtest/gtest.h>

#include "../../examples/collector/Hub.h"

#include <chrono>
#include <string>
#include <thread>

namespace collector {
namespace {

using namespace std::chrono_literals;

// One that comes late and one that does not read get the latest, and can tell what they missed.
TEST(HubTest, KeepsTheLatestWithinBothBounds) {
    Hub hub;
    EXPECT_FALSE(hub.next(0, 0ms));
    for (std::size_t i = 0; i < Hub::mostMessages + 10; ++i) hub.publish(std::to_string(i + 1));
    EXPECT_EQ(hub.beforeOldest(), 10);
    EXPECT_EQ(*hub.next(10, 0ms)->text, "11");
    EXPECT_EQ(hub.next(3, 0ms)->number, 11) << "overtaken";
    EXPECT_FALSE(hub.next(hub.latest(), 0ms));

    hub.publish(std::string(Hub::mostBytes + 1, 'x'));
    EXPECT_EQ(hub.beforeOldest(), hub.latest() - 1) << "the latest stays, however large";
}

TEST(HubTest, ClosingWakesWhoeverWaits) {
    Hub hub;
    std::jthread viewer([&] { EXPECT_FALSE(hub.next(0, 1h)); });
    hub.close();
}

}  // namespace
}  // namespace collector
