#pragma once

#include <corvane/Platform/Error.h>
#include <corvane/Transfer/TransferRequest.h>
#include <corvane/Transfer/TransferSessionConfiguration.h>

#include <functional>
#include <memory>
#include <optional>
#include <string>

namespace corvane {

class SerialQueue;

/// Plain HTTP requests inside the process, apart from any transfer session.
///
/// Owned by whoever makes it. It has a queue of its own, on which completions run; they never run inside a call. What
/// is under way when the session is destroyed goes on, and its completions still run. Callable from any thread.
///
///     HTTPSession session;
///     session.get("https://example.com/ping", [](auto response, auto error) { ... });
class HTTPSession {
  public:
    /// @param response the head of the answer, if there was one; also beside an error, when the connection broke inside
    ///        the answer's body.
    /// @param error what went wrong, a `TransferError` as a rule.
    using Completion = std::function<void(std::optional<TransferResponse> response, std::optional<AnyError> error)>;

    /// `limits.transfersPerHost` is the number of connections to one host; further requests wait.
    explicit HTTPSession(TransferLimits limits = {});

    /// Asks for a URL and calls `completion` once. The body is dropped. Any status is a response; a URL that cannot be
    /// used is an error. A "file" URL of a file that can be read gives a response that is not HTTP, without looking
    /// into the file.
    void get(std::string url, Completion completion);

  private:
    const TransferLimits limits_;
    const std::string pool_;
    const std::shared_ptr<SerialQueue> queue_;
};

}  // namespace corvane
