#include <corvane/Agent/TransferOutcome.h>

#include <corvane/Agent/WireReader.h>
#include <corvane/Agent/WireWriter.h>
#include <corvane/Transfer/TransferError.h>

#include <utility>

namespace corvane {

namespace {
using Code = TransferError::Code;
constexpr auto lastCode = static_cast<std::int64_t>(Code::blocked);
// Fits into a message with the longest description that a submission can have.
constexpr std::size_t longestHeaders = std::size_t{192} * 1024;

std::size_t encodedSize(const std::map<std::string, std::string>& headers) {
    std::size_t size = 0;
    for (const auto& [name, value] : headers) size += name.size() + value.size() + 8;
    return size;
}
}  // namespace

TransferOutcome TransferOutcome::of(const std::optional<AnyError>& error, std::optional<TransferResponse> response) {
    TransferOutcome made;
    if (error) {
        const auto* known = error->as<TransferError>();
        made.errorCode = static_cast<std::int64_t>(known ? known->value() : Code::network);
        made.errorText = error->what();
    }
    made.response = std::move(response);
    // A head of many short fields takes more room than it came in; the status is what counts.
    if (made.response && encodedSize(made.response->headers) > longestHeaders) made.response->headers.clear();
    return made;
}

std::optional<AnyError> TransferOutcome::error() const {
    if (!errorCode) return std::nullopt;
    const bool isKnown = *errorCode >= 0 && *errorCode <= lastCode;  // or else of a later agent's
    return AnyError(TransferError(isKnown ? static_cast<Code>(*errorCode) : Code::network, errorText));
}

std::string TransferOutcome::encoded() const {
    WireWriter write;
    write(errorCode, errorText, response.has_value());
    if (response) write(response->isHTTP, response->statusCode, response->headers);
    return write.take();
}

TransferOutcome TransferOutcome::unreadable() {
    TransferOutcome made;
    made.errorCode = static_cast<std::int64_t>(Code::network);
    made.errorText = "how the transfer ended can no longer be read";
    return made;
}

TransferOutcome TransferOutcome::decode(std::string_view bytes) {
    WireReader read(bytes);
    TransferOutcome made;
    bool answered = false;
    read(made.errorCode, made.errorText, answered);
    if (answered) {
        auto& response = made.response.emplace();
        read(response.isHTTP, response.statusCode, response.headers);
    }
    return made;
}

}  // namespace corvane
