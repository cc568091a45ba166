#pragma once

#include <corvane/Models/JSON.h>

#include "tests/support/ScriptedServer.h"

#include <set>
#include <string>
#include <vector>

namespace corvane::test {

/// The contents of one whole gzip member; throws `std::runtime_error` for anything else.
[[nodiscard]] std::string gunzip(const std::string& bytes);

/// Whether `base64` is the Ed25519 signature of `digest` by the key whose public half is `publicPEM`.
[[nodiscard]] bool verifies(const std::string& publicPEM, const std::string& digest, const std::string& base64);

/// The documents that a server has received whole, in order: a client that was killed may have sent the beginning of
/// one.
[[nodiscard]] std::vector<JSON> documentsAt(const ScriptedServer& server);

/// The identifiers of the events in documents, taken from the property "event".
[[nodiscard]] std::multiset<std::string> eventIDs(const std::vector<JSON>& documents);

}  // namespace corvane::test
