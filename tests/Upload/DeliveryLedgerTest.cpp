#include <corvane/Upload/DeliveryLedger.h>

#include "tests/support/Testing.h"

#include <functional>
#include <vector>

namespace corvane::test {
namespace {

TEST(DeliveryLedger, WaitEndsWithTheLastDocument) {
    DeliveryLedger ledger;
    const auto noDeadline = std::chrono::steady_clock::now() + std::chrono::hours(1);
    EXPECT_EQ(ledger.wait(noDeadline), DeliveryReport{});
    ledger.add("a", 2);
    ledger.add("refused", 2);
    std::jthread settling([&] {
        ledger.settle("a", DeliveryLedger::Outcome::delivered);
        ledger.remove("refused");
    });
    EXPECT_EQ(ledger.wait(noDeadline).delivered, (DeliveryReport::Count{2, 1}));
}

TEST(DeliveryLedger, KnowsWhichDocumentsWaitForAServerThatCannotBeReached) {
    using Outcome = DeliveryLedger::Outcome;
    using Reason = DeliveryUpdate::Reason;
    const auto end = [](Outcome outcome, Reason reason) {
        return [=](DeliveryLedger& ledger) { ledger.settle("b", outcome, {.reason = reason}); };
    };
    const auto heldUp = [](DeliveryLedger& ledger) { ledger.holdUp(true); };
    const auto enter = [](DeliveryLedger& ledger) { ledger.add("c", 1); };
    const struct {
        const char* what;
        std::vector<std::function<void(DeliveryLedger&)>> steps;
        bool isKnown;  // of all that is left of "a", "b" and "c"
    } cases[] = {
        {"nothing has happened", {}, false},
        {"no connection", {end(Outcome::pending, Reason::unreachable)}, true},
        {"no trusted connection", {end(Outcome::pending, Reason::blocked)}, true},
        {"a later document has an attempt of its own", {end(Outcome::pending, Reason::unreachable), enter}, false},
        {"a connection that breaks says nothing", {heldUp, end(Outcome::pending, Reason::failed)}, true},
        {"any answer", {heldUp, end(Outcome::pending, Reason::answer)}, false},
        {"part of a body", {heldUp, [](DeliveryLedger& ledger) { ledger.progress("a", 1, 2); }}, false},
        {"the session holds up what is entered later, too", {heldUp, enter}, true},
        {"one that it gives up does not end that", {heldUp, end(Outcome::pending, Reason::unreachable), enter}, true},
        {"until it goes on", {heldUp, enter, [](DeliveryLedger& ledger) { ledger.holdUp(false); }}, false},
        {"or nothing is left",
         {heldUp, end(Outcome::pending, Reason::unreachable), [](DeliveryLedger& ledger) { ledger.remove("a"); },
          enter},
         false},
    };
    for (const auto& [what, steps, isKnown] : cases) {
        DeliveryLedger ledger;
        ledger.add("a", 1);
        ledger.addEarlier("b");
        for (const auto& step : steps) step(ledger);
        EXPECT_EQ(ledger.isSettled(true), isKnown) << what;
        EXPECT_FALSE(ledger.isSettled()) << what;
    }
}

}  // namespace
}  // namespace corvane::test
