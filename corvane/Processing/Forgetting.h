#pragma once

#include <corvane/Platform/Error.h>
#include <corvane/Platform/ForgottenRecords.h>

#include <cstdint>
#include <functional>

namespace corvane {

using ForgetCompletion = std::function<void(const ForgottenRecords& forgotten, const AnyError* error)>;

/// Removes what was recorded before an epoch, and is not delivered, from the documents directory: the rows of every
/// endpoint's database, the payloads, all debugging copies, and what the transfer agent has of them, whose transfers
/// are stopped. Then notes that this is done; until then every session start does it again.
///
/// Returns at once; the work is done on the store's queue, and `done` is called on a queue or thread of the library's,
/// once, with what was dropped and, unless all of it was, why not. An endpoint whose database cannot be written keeps
/// the others from nothing. Internal.
void forgetDirectory(std::int64_t epoch, ForgetCompletion done);

/// Does so where an earlier call, of whichever process, was not finished. Logs what fails.
void finishForgetting();

}  // namespace corvane
