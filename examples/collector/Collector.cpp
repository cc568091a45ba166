#include "Collector.h"

#include "Document.h"
#include "Refusal.h"
#include "gunzip.h"

#include <corvane/Platform/JSONText.h>

#include <chrono>
#include <cstdio>
#include <exception>
#include <string_view>

namespace collector {

namespace {

constexpr std::string_view contentType = "application/vnd.veskar.corvane.user_events+json; version=0.1.0";
constexpr std::size_t largestDocument = std::size_t{256} << 20;

void checkHeaders(const Upload& upload) {
    if (upload.contentType != contentType) {
        throw Refusal(400, "Content-Type is not \"" + std::string(contentType) + "\"");
    }
    if (upload.contentEncoding != "gzip") throw Refusal(400, "Content-Encoding is not \"gzip\"");
    if (upload.userAgent.empty()) throw Refusal(400, "User-Agent is missing");
}

constexpr std::size_t largestShownDocument = std::size_t{1} << 20;

std::string now() {
    using namespace std::chrono;
    return std::to_string(duration_cast<milliseconds>(system_clock::now().time_since_epoch()).count());
}

// What the page gets to see. The document stands in it as it came: it is JSON, in one line.
std::string messageOf(const Document& document, const Archive::Counts& added, std::size_t bytes, bool isVerified) {
    std::string text = R"({"kind":"document","time":)" + now() + R"(,"identifier":")" + document.identifier +
                       R"(","isDuplicate":)" + (added.documents > 0 ? "false" : "true") + R"(,"newEvents":)" +
                       std::to_string(added.events) + R"(,"duplicateEvents":)" + std::to_string(added.duplicateEvents) +
                       R"(,"events":)" + std::to_string(document.events) + R"(,"bytes":)" + std::to_string(bytes) +
                       R"(,"unpackedBytes":)" + std::to_string(document.line.size()) + R"(,"signature":")" +
                       (isVerified ? "verified" : "no key") + '"';
    // A page could not show it in any useful way, and a few of these would push out all others.
    if (document.line.size() <= largestShownDocument) text += R"(,"document":)" + document.line;
    return text + '}';
}

std::string messageOf(int status, const char* reason) {
    std::string text =
        R"({"kind":"refusal","time":)" + now() + R"(,"status":)" + std::to_string(status) + R"(,"reason":)";
    if (!corvane::jsontext::appendString(text, reason)) text += R"("the reason is not text")";
    return text + '}';
}

long long shown(std::int64_t number) {
    return number;
}

}  // namespace

Collector::Collector(const std::filesystem::path& directory, const std::optional<std::filesystem::path>& publicKeyFile,
                     const std::optional<std::filesystem::path>& schemas)
    : archive_(directory) {
    if (publicKeyFile) verifier_.emplace(*publicKeyFile);
    if (schemas) schemas_.emplace(*schemas);
}

Answer Collector::receive(const Upload& upload) noexcept {
    try {
        return accept(upload);
    } catch (const Refusal& refusal) {
        return refuse(refusal.status(), refusal.what());
    } catch (const std::exception& error) {
        return refuse(500, error.what());
    }
}

Answer Collector::accept(const Upload& upload) {
    checkHeaders(upload);
    if (verifier_) verifier_->verify(upload.body, upload.signature);
    const Document document = readDocument(gunzip(upload.body, largestDocument));
    const auto report = schemas_ ? schemas_->check(corvane::JSON(document.line)) : SchemaFolder::Report();

    const std::lock_guard lock(mutex_);
    const Archive::Counts added = archive_.add(document);
    std::printf("%s %s: %lld new events, %lld duplicate, %zu bytes%s\n",
                added.documents > 0 ? "document" : "duplicate document", document.identifier.c_str(),
                shown(added.events), shown(added.duplicateEvents), upload.body.size(),
                verifier_ ? ", signature verified" : "");
    print(report);
    std::fflush(stdout);
    hub_.publish(messageOf(document, added, upload.body.size(), verifier_.has_value()));
    return {200, "accepted\n"};
}

// A sender gives a document up that is refused, so what does not match is said here and to nobody else.
void Collector::print(const SchemaFolder::Report& report) {
    mismatches_ += static_cast<std::int64_t>(report.mismatches);
    for (const std::string& line : report.lines) std::printf("  does not match: %s\n", line.c_str());
}

Answer Collector::refuse(int status, const char* reason) {
    const std::lock_guard lock(mutex_);
    ++refused_;
    std::printf("refused with %d: %s\n", status, reason);
    std::fflush(stdout);
    hub_.publish(messageOf(status, reason));
    return {status, std::string(reason) + "\n"};
}

void Collector::printTotals() {
    const std::lock_guard lock(mutex_);
    const Archive::Counts& counts = archive_.counts();
    std::printf("documents: %lld, and %lld duplicate\n", shown(counts.documents), shown(counts.duplicateDocuments));
    std::printf("events: %lld, and %lld duplicate\n", shown(counts.events), shown(counts.duplicateEvents));
    std::printf("requests refused: %lld\n", shown(refused_));
    if (schemas_) std::printf("events that do not match their schemas: %lld\n", shown(mismatches_));
    std::fflush(stdout);
}

}  // namespace collector
