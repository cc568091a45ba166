#pragma once

#include <corvane/Transfer/TransferOutcome.h>

#include <string>
#include <string_view>

namespace corvane {

// An outcome in the form that outlives the process, in the journal and in messages; docs/formats/transfer-journal.md
// has the bytes. Internal.

/// An error that is no `TransferError` becomes one of the network, and header fields that fit into no message are left
/// out: the status is what counts.
[[nodiscard]] std::string encodeOutcome(const TransferOutcome& outcome);
/// Throws `FormatError` for bytes that are no outcome; what a later version has appended is left alone.
[[nodiscard]] TransferOutcome decodeOutcome(std::string_view bytes);
/// In place of one that cannot be decoded: a failure, so that its task is tried again.
[[nodiscard]] TransferOutcome unreadableOutcome();

}  // namespace corvane
