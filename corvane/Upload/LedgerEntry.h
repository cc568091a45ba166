#pragma once

#include <corvane/Upload/Ledger.h>

#include <optional>
#include <string_view>

namespace corvane {

/// The totals of a ledger that are kept on disk, each in a row of its own. Internal.
enum class LedgerEntry {
    delivered,
    refused4xx,
    refused3xx,
    refusedOther,
    givenUpAttempts,
    givenUpAge,
    givenUpSize,
    givenUpPayloadMissing,
    givenUpForgotten,
    unknown,
    sentAgain,
    noSession,
    missingData,
    encoding,
    notRecording,
    otherProblem,
};

/// The name of an entry's row. It outlives the process: names are neither changed nor used again.
[[nodiscard]] std::string_view nameOf(LedgerEntry entry);
/// The entry of a name; nothing for a later release's.
[[nodiscard]] std::optional<LedgerEntry> ledgerEntryOf(std::string_view name);
/// Which class of answers a refusal belongs to.
[[nodiscard]] LedgerEntry refusalOf(std::int64_t statusCode);
/// Adds to the ledger's total of an entry.
void addTo(Ledger& ledger, LedgerEntry entry, const Ledger::Count& count);

}  // namespace corvane
