#include <corvane/Upload/LedgerEntry.h>

#include <algorithm>
#include <array>
#include <iterator>
#include <utility>

namespace corvane {

namespace {

using Entry = LedgerEntry;

constexpr auto names = std::to_array<std::string_view>(
    {"delivered", "refused 4xx", "refused 3xx", "refused otherwise", "given up: attempts", "given up: age",
     "given up: size", "given up: payload missing", "given up: forgotten", "unknown", "sent again",
     "not accepted: no session", "not accepted: missing data", "not accepted: encoding", "not accepted: not recording",
     "not accepted: other"});
static_assert(names.size() == static_cast<std::size_t>(Entry::otherProblem) + 1);

// The total of an entry that counts documents; nullptr for one that does not.
Ledger::Count* countOf(Ledger& ledger, Entry entry) {
    switch (entry) {
        case Entry::delivered:
            return &ledger.delivered;
        case Entry::refused4xx:
            return &ledger.refused.status4xx;
        case Entry::refused3xx:
            return &ledger.refused.status3xx;
        case Entry::refusedOther:
            return &ledger.refused.other;
        case Entry::givenUpAttempts:
            return &ledger.givenUp.attempts;
        case Entry::givenUpAge:
            return &ledger.givenUp.age;
        case Entry::givenUpSize:
            return &ledger.givenUp.size;
        case Entry::givenUpPayloadMissing:
            return &ledger.givenUp.payloadMissing;
        case Entry::givenUpForgotten:
            return &ledger.givenUp.forgotten;
        case Entry::unknown:
            return &ledger.unknown;
        case Entry::sentAgain:
            return &ledger.sentAgain;
        default:
            return nullptr;
    }
}

std::int64_t& notAccepted(Ledger& ledger, Entry entry) {
    auto& counts = ledger.notAccepted;
    switch (entry) {
        case Entry::noSession:
            return counts.noSession;
        case Entry::missingData:
            return counts.missingData;
        case Entry::encoding:
            return counts.encoding;
        case Entry::notRecording:
            return counts.notRecording;
        default:
            return counts.other;
    }
}

}  // namespace

std::string_view nameOf(LedgerEntry entry) {
    return names.at(static_cast<std::size_t>(entry));
}

std::optional<LedgerEntry> ledgerEntryOf(std::string_view name) {
    const auto* const found = std::find(names.begin(), names.end(), name);
    if (found == names.end()) return std::nullopt;
    return static_cast<LedgerEntry>(std::distance(names.begin(), found));
}

LedgerEntry refusalOf(std::int64_t statusCode) {
    const auto statusClass = statusCode / 100;
    return statusClass == 4 ? Entry::refused4xx : statusClass == 3 ? Entry::refused3xx : Entry::refusedOther;
}

void addTo(Ledger& ledger, LedgerEntry entry, const Ledger::Count& count) {
    if (auto* total = countOf(ledger, entry)) {
        total->events += count.events;
        total->documents += count.documents;
    } else {
        notAccepted(ledger, entry) += count.events;
    }
}

}  // namespace corvane
