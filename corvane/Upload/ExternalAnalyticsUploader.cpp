#include <corvane/Upload/ExternalAnalyticsUploader.h>

#include <corvane/Transfer/HTTPSession.h>

#include <algorithm>
#include <thread>
#include <utility>

namespace corvane {

namespace {
TransferLimits limitsOfThisMachine() {
    TransferLimits limits;
    limits.transfersPerHost = 2 * static_cast<int>(std::max(1u, std::thread::hardware_concurrency()));
    return limits;
}
}  // namespace

ExternalAnalyticsUploaderError::ExternalAnalyticsUploaderError(Code code)
    : Error("Corvane.ExternalAnalyticsUploader.Errors", code, "the server did not answer in HTTP") {}
ExternalAnalyticsUploaderError::~ExternalAnalyticsUploaderError() = default;

ExternalAnalyticsUploader::ExternalAnalyticsUploader()
    : session_(std::make_shared<HTTPSession>(limitsOfThisMachine())) {}

void ExternalAnalyticsUploader::submitExternalAnalytics(std::string url, Completion completion) {
    session_->get(std::move(url), [completion = std::move(completion)](std::optional<TransferResponse> response,
                                                                       std::optional<AnyError> error) {
        using Result = ExternalResult<TransferResponse>;
        if (!completion) return;
        if (response && response->isHTTP) {
            completion(Result::success(*std::move(response)));
        } else if (error) {
            completion(Result::failed(*std::move(error)));
        } else {
            completion(Result::failed(AnyError(Errors(Errors::invalidResponse))));
        }
    });
}

}  // namespace corvane
