#include <corvane/Upload/DeliveryLedger.h>

#include "tests/support/Testing.h"

namespace corvane::test {
namespace {

using Outcome = DeliveryLedger::Outcome;

TEST(DeliveryLedger, FoldsOutcomesIntoTotals) {
    DeliveryLedger ledger;
    ledger.add("a", 50);
    ledger.add("b", 20);
    ledger.add("c", 1);
    ledger.add("d", 3);
    ledger.addEarlier("old");
    ledger.addEarlier("a");  // is known: changes nothing
    ledger.settle("a", Outcome::delivered);
    ledger.settle("b", Outcome::pending);
    ledger.settle("b", Outcome::delivered);  // settled for good
    ledger.settle("c", Outcome::givenUp);
    ledger.settle("unknown", Outcome::delivered);
    ledger.settle("old", Outcome::delivered);

    const DeliveryReport open{.delivered = {50, 2}, .pending = {23, 2}, .givenUp = {1, 1}};
    EXPECT_EQ(ledger.report(), open);
    EXPECT_EQ(ledger.wait(std::chrono::steady_clock::now()), open);  // never past the deadline
    ledger.remove("d");
    EXPECT_EQ(ledger.report().pending, (DeliveryReport::Count{20, 1}));
}

TEST(DeliveryLedger, WaitEndsWithTheLastDocument) {
    DeliveryLedger ledger;
    const auto noDeadline = std::chrono::steady_clock::now() + std::chrono::hours(1);
    EXPECT_EQ(ledger.wait(noDeadline), DeliveryReport{});
    ledger.add("a", 2);
    ledger.add("refused", 2);
    std::jthread settling([&] {
        ledger.settle("a", Outcome::delivered);
        ledger.remove("refused");
    });
    EXPECT_EQ(ledger.wait(noDeadline).delivered, (DeliveryReport::Count{2, 1}));
}

}  // namespace
}  // namespace corvane::test
