#pragma once

#include <corvane/Models/JSON.h>

#include <set>
#include <string>
#include <vector>

namespace corvane::test {

/// Whether `base64` is the Ed25519 signature of `digest` by the key whose public half is `publicPEM`.
[[nodiscard]] bool verifies(const std::string& publicPEM, const std::string& digest, const std::string& base64);

/// The identifiers of the events in documents, taken from the property "event".
[[nodiscard]] std::multiset<std::string> eventIDs(const std::vector<JSON>& documents);

}  // namespace corvane::test
