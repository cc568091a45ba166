#include <corvane/Upload/Ledger.h>

#include <initializer_list>

namespace corvane {

namespace {

Ledger::Count sum(std::initializer_list<Ledger::Count> counts) {
    Ledger::Count sum;
    for (const auto& count : counts) {
        sum.events += count.events;
        sum.documents += count.documents;
    }
    return sum;
}

}  // namespace

Ledger::Count Ledger::Refused::total() const {
    return sum({status4xx, status3xx, other});
}

Ledger::Count Ledger::GivenUp::total() const {
    return sum({attempts, age, size, payloadMissing, forgotten});
}

Ledger::Count Ledger::accepted() const {
    return sum({{open.events, 0}, waiting, delivered, refused.total(), givenUp.total(), unknown});
}

}  // namespace corvane
