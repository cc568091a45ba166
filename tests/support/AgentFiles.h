#pragma once

#include <corvane/Agent/TransferSubmission.h>
#include <corvane/Platform/Bytes.h>

#include <string>
#include <string_view>

namespace corvane::test {

/// Bytes as SQL text.
inline std::string literal(std::string_view bytes) {
    std::string text = "x'";
    appendHexDigits(text, bytes);
    return text + "'";
}

inline TransferSubmission submission(const std::string& token, const std::string& owner) {
    TransferSubmission made;
    made.token = token;
    made.session = "s";
    made.owner = owner;
    made.request.url = "http://127.0.0.1/";
    made.bodyPath = "/body";
    return made;
}

}  // namespace corvane::test
