#pragma once

#include <corvane/Export.h>
#include <corvane/Transfer/TransferResponse.h>
#include <corvane/Upload/ExternalResult.h>

#include <functional>
#include <string>

namespace corvane {

/// Sends single requests to servers that are no collectors, such as an advertiser's counter.
class CORVANE_EXPORT ExternalAnalyticsUploaderType {
  public:
    /// Called once, on a queue of the uploader's; what it throws is logged.
    using Completion = std::function<void(const ExternalResult<TransferResponse>&)>;

    virtual ~ExternalAnalyticsUploaderType() = default;

    /// Asks for `url` with a GET request and reports the head of the answer, whatever its status: look at the status
    /// code. Callable from any thread; never calls back inside the call. An empty completion is allowed.
    virtual void submitExternalAnalytics(std::string url, Completion completion) = 0;

  protected:
    ExternalAnalyticsUploaderType() = default;
    ExternalAnalyticsUploaderType(const ExternalAnalyticsUploaderType&) = default;
    ExternalAnalyticsUploaderType& operator=(const ExternalAnalyticsUploaderType&) = default;
};

}  // namespace corvane
