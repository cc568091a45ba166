#include <corvane/Transfer/HTTPSession.h>

#include <corvane/Platform/SerialQueue.h>
#include <corvane/Platform/UUID.h>
#include <corvane/Transfer/TransferError.h>
#include <corvane/Transfer/TransferThread.h>

#include <curl/curl.h>
#include <unistd.h>

#include <cerrno>
#include <utility>

namespace corvane {

namespace {

// The path of a "file" URL; nothing for any other.
std::optional<std::string> filePath(const std::string& text) {
    const std::unique_ptr<CURLU, decltype(&curl_url_cleanup)> url(curl_url(), curl_url_cleanup);
    char* path = nullptr;
    if (!text.starts_with("file:") || !url || curl_url_set(url.get(), CURLUPART_URL, text.c_str(), 0) != CURLUE_OK ||
        curl_url_get(url.get(), CURLUPART_PATH, &path, CURLU_URLDECODE) != CURLUE_OK) {
        return std::nullopt;
    }
    const std::unique_ptr<char, decltype(&curl_free)> owned(path, curl_free);
    return path;
}

}  // namespace

HTTPSession::HTTPSession(TransferLimits limits)
    : limits_(limits),
      pool_("session " + newUUID()),
      queue_(std::make_shared<SerialQueue>("com.veskar.corvane.http-session")) {}

void HTTPSession::get(std::string url, Completion completion) {
    if (const auto path = filePath(url)) {
        queue_->async([path = *path, completion = std::move(completion)] {
            if (access(path.c_str(), R_OK) == 0) {
                completion(TransferResponse{.isHTTP = false, .statusCode = 0, .headers = {}}, std::nullopt);
            } else {
                completion(std::nullopt, AnyError(SystemError("read " + path, errno)));
            }
        });
        return;
    }
    HTTPTransfer transfer;
    transfer.request.url = std::move(url);
    transfer.request.method = "GET";
    transfer.limits = limits_;
    transfer.proxy = TransferProxy::ofEnvironment(transfer.request.url);
    transfer.pool = pool_;
    transfer.didComplete = [queue = queue_, completion = std::move(completion)](TransferOutcome outcome) {
        queue->async([completion, outcome = std::move(outcome)] { completion(outcome.response, outcome.error); });
    };
    TransferThread::start(std::move(transfer));
}

}  // namespace corvane
