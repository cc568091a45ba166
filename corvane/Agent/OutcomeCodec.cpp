#include <corvane/Agent/OutcomeCodec.h>

#include <corvane/Agent/WireReader.h>
#include <corvane/Agent/WireWriter.h>
#include <corvane/Transfer/TransferError.h>

#include <cstdint>
#include <map>
#include <optional>
#include <utility>

namespace corvane {

namespace {

using Code = TransferError::Code;

constexpr auto lastCode = static_cast<std::int64_t>(Code::cancelled);
// Fits into a message with the longest description that a submission can have.
constexpr std::size_t longestHeaders = std::size_t{192} * 1024;

// A head of many short fields takes more room than it came in.
std::size_t encodedSize(const std::map<std::string, std::string>& headers) {
    std::size_t size = 0;
    for (const auto& [name, value] : headers) size += name.size() + value.size() + 8;
    return size;
}

std::optional<std::int64_t> codeOf(const std::optional<AnyError>& error) {
    if (!error) return std::nullopt;
    const auto* known = error->as<TransferError>();
    return static_cast<std::int64_t>(known ? known->value() : Code::network);
}

}  // namespace

std::string encodeOutcome(const TransferOutcome& outcome) {
    const auto& response = outcome.response;
    WireWriter write;
    write(codeOf(outcome.error), std::string(outcome.error ? outcome.error->what() : ""), response.has_value());
    if (response) {
        const bool fits = encodedSize(response->headers) <= longestHeaders;
        write(response->isHTTP, response->statusCode, fits ? response->headers : std::map<std::string, std::string>());
    }
    return write.take();
}

TransferOutcome decodeOutcome(std::string_view bytes) {
    WireReader read(bytes);
    std::optional<std::int64_t> code;
    std::string text;
    bool answered = false;
    read(code, text, answered);
    TransferOutcome made;
    if (code) {
        const bool isKnown = *code >= 0 && *code <= lastCode;  // or else of a later agent's
        made.error = AnyError(TransferError(isKnown ? static_cast<Code>(*code) : Code::network, std::move(text)));
    }
    if (answered) {
        auto& response = made.response.emplace();
        read(response.isHTTP, response.statusCode, response.headers);
    }
    return made;
}

TransferOutcome unreadableOutcome() {
    return {AnyError(TransferError(Code::network, "how the transfer ended can no longer be read")), std::nullopt};
}

}  // namespace corvane
