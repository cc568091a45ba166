#include <corvane/Upload/DeliveryLedger.h>

#include "tests/support/Testing.h"

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

}  // namespace
}  // namespace corvane::test
