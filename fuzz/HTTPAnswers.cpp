// What a server answers, in whatever pieces libcurl receives it.

#include <corvane/Agent/OutcomeCodec.h>
#include <corvane/Models/Encoder.h>
#include <corvane/Transfer/CurlTransfer.h>
#include <corvane/Transfer/HTTPTransfer.h>
#include <corvane/Upload/RetryAfter.h>

#include "fuzz/FuzzTarget.h"

#include <curl/curl.h>
#include <sys/socket.h>

using namespace corvane;

// libcurl's, whose sockets are connected already: some versions do not take that from a callback.
extern "C" int connect(int, const sockaddr*, socklen_t) {
    return 0;
}

/// Sends to nobody, and has the answer come in packets of at most `piece` bytes before the connection ends.
static TransferOutcome outcome(std::string_view answer, std::size_t piece) {
    int sockets[2];
    CORVANE_REQUIRE(socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, sockets) == 0, "no sockets");
    const Descriptor server(sockets[1]);
    for (; !answer.empty(); answer.remove_prefix(std::min(piece, answer.size()))) {
        if (send(server.get(), answer.data(), std::min(piece, answer.size()), MSG_NOSIGNAL | MSG_DONTWAIT) < 0) break;
    }
    shutdown(server.get(), SHUT_WR);
    HTTPTransfer request;
    request.request.url = "http://127.0.0.1/";
    request.bodyPath = FUZZ_BODY;
    request.limits.responseBody = 200;
    CurlTransfer transfer(request);
    const curl_opensocket_callback open = [](void* made, curlsocktype, curl_sockaddr*) {
        return *static_cast<int*>(made);
    };
    curl_easy_setopt(transfer.handle(), CURLOPT_OPENSOCKETFUNCTION, open);
    curl_easy_setopt(transfer.handle(), CURLOPT_OPENSOCKETDATA, sockets);
    const int code = curl_easy_perform(transfer.handle());
    transfer.update(CurlTransfer::Clock::now());
    return {transfer.error(code), transfer.response()};
}

static void checkResponse(UploadResponse response) {
    try {
        CORVANE_REQUIRE(JSON::fromEncodedText(response.jsonText()).isObject(), "the head is no JSON");
    } catch (const EncodingError&) {
        CORVANE_REQUIRE(!jsontext::isUTF8(response.description()), "a head that is UTF-8 cannot be written");
    }
    response.statusCode = 503;
    const auto delay = retryAfter(response, dateFromMilliseconds(1'800'000'000'000).value());
    CORVANE_REQUIRE(!delay || (delay->count() >= 0 && *delay <= longestRetryAfter), "a delay is out of range");
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0) return 0;
    const auto answer = fuzz::textOf(data, size - 1);
    const auto whole = outcome(answer, 8 * 1024);
    const auto cut = outcome(answer, std::max<std::size_t>({data[size - 1], answer.size() / 32, 1}));
    const bool isSame = whole.response == cut.response && whole.error.has_value() == cut.error.has_value();
    // What libcurl makes of a NUL depends on where it stands in what it has received.
    CORVANE_REQUIRE(isSame || answer.find('\0') != std::string_view::npos, "the pieces make another answer");
    CORVANE_REQUIRE(whole.error ? *whole.error->what() : whole.response && whole.response->statusCode >= 200,
                    "there is no outcome");
    CORVANE_REQUIRE(decodeOutcome(encodeOutcome(whole)).response == whole.response, "an answer does not come back");
    if (whole.response) checkResponse({whole.response->statusCode, whole.response->headers});
    return 0;
}
