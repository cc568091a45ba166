#include <corvane/Platform/TransferOutcome.h>

#include <corvane/Platform/TransferError.h>
#include <corvane/Platform/WireReader.h>
#include <corvane/Platform/WireWriter.h>

#include <utility>

namespace corvane {

namespace {
using Code = TransferError::Code;
constexpr auto lastCode = static_cast<std::int64_t>(Code::unreachable);
}  // namespace

TransferOutcome TransferOutcome::of(const std::optional<AnyError>& error, std::optional<TransferResponse> response) {
    TransferOutcome made;
    if (error) {
        const auto* known = error->as<TransferError>();
        made.errorCode = static_cast<std::int64_t>(known ? known->value() : Code::network);
        made.errorText = error->what();
    }
    made.response = std::move(response);
    return made;
}

std::optional<AnyError> TransferOutcome::error() const {
    if (!errorCode) return std::nullopt;
    return AnyError(TransferError(static_cast<Code>(*errorCode), errorText));
}

std::string TransferOutcome::encoded() const {
    WireWriter write;
    write(errorCode, errorText, response.has_value());
    if (response) write(response->isHTTP, response->statusCode, response->headers);
    return write.take();
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
    read.finish();
    if (made.errorCode && (*made.errorCode < 0 || *made.errorCode > lastCode)) {
        throw InvalidArgument("the error of the outcome is unknown");
    }
    return made;
}

}  // namespace corvane
