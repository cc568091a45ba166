#include "Payload.h"

#include "StoredDatabase.h"
#include "examples/collector/Document.h"
#include "examples/collector/Refusal.h"
#include "examples/collector/SignatureVerifier.h"
#include "examples/collector/gunzip.h"

#include <corvane/Platform/Bytes.h>
#include <corvane/Platform/PrivateFile.h>
#include <corvane/Signing/SHA1.h>

#include <strings.h>
#include <algorithm>
#include <functional>

namespace inspect {

namespace {

constexpr std::size_t largestDocument = std::size_t{1} << 30;

std::optional<std::string> problemOf(const std::function<void()>& check) {
    try {
        check();
        return std::nullopt;
    } catch (const std::exception& problem) {
        return problem.what();
    }
}

}  // namespace

bool Payload::isGood() const {
    return std::none_of(checks.begin(), checks.end(), [](const Check& check) { return check.problem.has_value(); });
}

Payload Payload::read(const std::filesystem::path& file, const std::optional<std::string>& signature,
                      const std::filesystem::path& publicKey) {
    Payload payload;
    try {
        payload.body = corvane::readWholeFile(file);
    } catch (const std::exception& problem) {
        throw Problem(problem.what());
    }
    payload.digest = corvane::hexString(corvane::sha1Digest(payload.body));
    if (signature) {
        payload.checks.push_back({"signature", problemOf([&] {
                                      collector::SignatureVerifier(publicKey).verify(payload.body, *signature);
                                  })});
    }
    payload.checks.push_back(
        {"gzip", problemOf([&] { payload.text = collector::gunzip(payload.body, largestDocument); })});
    if (payload.text) {
        payload.checks.push_back({"document", problemOf([&] {
                                      const std::string found = collector::readDocument(*payload.text).identifier;
                                      if (found != file.filename())
                                          throw Problem("the file holds another document, " + found);
                                  })});
    }
    return payload;
}

std::optional<std::string> signatureOf(const Document& document) {
    if (!document.task) return std::nullopt;
    for (const auto& [name, value] : document.task->submission.request.headers) {
        if (::strcasecmp(name.c_str(), "X-Veskar-ActionSignature") == 0) return value;
    }
    return std::nullopt;
}

}  // namespace inspect
