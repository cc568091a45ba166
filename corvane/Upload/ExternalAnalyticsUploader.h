#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/Error.h>
#include <corvane/Transfer/TransferRequest.h>

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <variant>

namespace corvane {

class HTTPSession;

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

/// What became of a request to somebody else's server: a value or an error. A value type.
template <class Value>
struct [[nodiscard]] ExternalResult {
    struct Success {
        Value value;
    };
    struct Failed {
        AnyError error;
    };

    std::variant<Success, Failed> result;

    static ExternalResult success(Value value) { return {Success{std::move(value)}}; }
    static ExternalResult failed(AnyError error) { return {Failed{std::move(error)}}; }

    /// The value of a success, or nothing.
    [[nodiscard]] std::optional<Value> valueOrNil() const {
        if (const auto* success = std::get_if<Success>(&result)) return success->value;
        return std::nullopt;
    }
};

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
    const std::shared_ptr<HTTPSession> session_;
};

}  // namespace corvane
