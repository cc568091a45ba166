#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/Error.h>

namespace corvane {

/// What an external uploader itself fails with: `ExternalAnalyticsUploader::Errors`. Domain
/// "Corvane.ExternalAnalyticsUploader.Errors".
class CORVANE_EXPORT ExternalAnalyticsUploaderError : public Error {
  public:
    enum Code {
        invalidResponse = 0,  ///< there was no answer, or it was not HTTP, and no error either
    };
    explicit ExternalAnalyticsUploaderError(Code code);
    ExternalAnalyticsUploaderError(const ExternalAnalyticsUploaderError&) = default;
    ExternalAnalyticsUploaderError& operator=(const ExternalAnalyticsUploaderError&) = default;
    ~ExternalAnalyticsUploaderError() override;

    [[nodiscard]] Code value() const noexcept { return static_cast<Code>(code()); }
};

}  // namespace corvane
