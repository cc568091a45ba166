// What a server answers, in whatever pieces libcurl receives it.

#include <corvane/Agent/OutcomeCodec.h>
#include <corvane/Models/Encoder.h>
#include <corvane/Testing/TemporaryDocuments.h>
#include <corvane/Transfer/CurlTransfer.h>
#include <corvane/Transfer/HTTPTransfer.h>
#include <corvane/Transfer/TransferError.h>
#include <corvane/Upload/RetryAfter.h>

#include "fuzz/FuzzTarget.h"
#include "tests/support/Files.h"

#include <curl/curl.h>
#include <sys/socket.h>

// libcurl's, whose sockets are connected already: some versions do not take that from a callback.
extern "C" int connect(int, const sockaddr*, socklen_t) {
    return 0;
}

namespace {

using namespace corvane;

HTTPTransfer request() {
    static const test::TemporaryDocuments documents;
    static const auto body = (test::writeFile(documents / "body", std::string(300, 'x')), documents / "body");
    HTTPTransfer made;
    made.request = {.url = "http://127.0.0.1/", .headers = {{"Content-Type", "text/plain"}}};
    made.bodyPath = body;
    made.limits.responseBody = 200;
    return made;
}

/// Sends to nobody, and has the answer come in packets of at most `piece` bytes before the connection ends.
TransferOutcome outcome(std::string_view answer, std::size_t piece) {
    int pair[2];
    CORVANE_REQUIRE(socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, pair) == 0, "no sockets");
    const Descriptor server(pair[1]);
    for (; !answer.empty(); answer.remove_prefix(std::min(piece, answer.size()))) {
        if (send(server.get(), answer.data(), std::min(piece, answer.size()), MSG_NOSIGNAL | MSG_DONTWAIT) < 0) break;
    }
    shutdown(server.get(), SHUT_WR);
    CurlTransfer transfer(request());
    const curl_opensocket_callback open = [](void* pair, curlsocktype, curl_sockaddr*) {
        return *static_cast<int*>(pair);
    };
    curl_easy_setopt(transfer.handle(), CURLOPT_OPENSOCKETFUNCTION, open);
    curl_easy_setopt(transfer.handle(), CURLOPT_OPENSOCKETDATA, pair);
    curl_easy_setopt(transfer.handle(), CURLOPT_FORBID_REUSE, 1L);
    const int code = curl_easy_perform(transfer.handle());
    transfer.update(CurlTransfer::Clock::now());
    return {transfer.error(code), transfer.response()};
}

void checkResponse(UploadResponse response) {
    static_cast<void>(response.description());
    try {
        CORVANE_REQUIRE(JSON::fromEncodedText(response.jsonText()).isObject(), "the head is no JSON");
    } catch (const EncodingError&) {
        CORVANE_REQUIRE(!jsontext::isUTF8(response.description()), "a head that is UTF-8 cannot be written");
    }
    for (const std::int64_t status : {response.statusCode, std::int64_t{503}}) {
        response.statusCode = status;
        const auto delay = retryAfter(response, dateFromMilliseconds(1'800'000'000'000).value());
        CORVANE_REQUIRE(!delay || (delay->count() >= 0 && *delay <= longestRetryAfter), "a delay is out of range");
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0) return 0;
    const auto answer = fuzz::textOf(data, size - 1);
    const auto whole = outcome(answer, 8 * 1024);
    const auto cut = outcome(answer, std::max<std::size_t>({data[size - 1], answer.size() / 32, 1}));
    const bool isSame = whole.response == cut.response && whole.error.has_value() == cut.error.has_value();
    // What libcurl makes of a NUL depends on where it stands in what it has received.
    CORVANE_REQUIRE(isSame || answer.find('\0') != std::string_view::npos, "the pieces make another answer");
    CORVANE_REQUIRE(whole.error || (whole.response && whole.response->statusCode >= 200), "there is no outcome");
    CORVANE_REQUIRE(!whole.error || *whole.error->what(), "an error says nothing");
    const auto kept = decodeOutcome(encodeOutcome(whole));
    CORVANE_REQUIRE(kept.response == whole.response, "an answer does not come back");
    if (whole.response) checkResponse({whole.response->statusCode, whole.response->headers});
    return 0;
}
