#pragma once

#include <cstdint>
#include <map>
#include <string>

namespace corvane {

/// The head of what a server answered. A value.
struct TransferResponse {
    bool isHTTP = true;           ///< whether the other members mean anything
    std::int64_t statusCode = 0;  ///< the final status, never a 1xx one
    /// Field values by name, spelled as in the answer. A field that came more than once has its values joined by ", "
    /// under the first spelling. The bytes are the server's: they need not be UTF-8.
    std::map<std::string, std::string> headers;

    bool operator==(const TransferResponse&) const = default;
};

}  // namespace corvane
