#pragma once

#include <corvane/Export.h>
#include <corvane/Transfer/HTTPSession.h>
#include <corvane/Upload/ExternalAnalyticsUploaderError.h>
#include <corvane/Upload/ExternalAnalyticsUploaderType.h>

#include <string>

namespace corvane {

/// The external uploader over an HTTP session of its own. It keeps no state: requests are neither stored nor repeated,
/// and those under way go on when the uploader is destroyed.
///
///     ExternalAnalyticsUploader uploader;
///     uploader.submitExternalAnalytics("https://ads.example.com/seen?id=7", [](const auto& result) {
///         if (auto response = result.valueOrNil()) note(response->statusCode);
///     });
class CORVANE_EXPORT ExternalAnalyticsUploader final : public ExternalAnalyticsUploaderType {
  public:
    using Errors = ExternalAnalyticsUploaderError;

    /// Allows twice as many connections to one host as there are processors.
    ExternalAnalyticsUploader();

    void submitExternalAnalytics(std::string url, Completion completion) override;

  private:
    HTTPSession session_;
};

}  // namespace corvane
