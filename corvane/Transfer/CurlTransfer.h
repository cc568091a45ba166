#pragma once

#include <corvane/Platform/Descriptor.h>
#include <corvane/Transfer/HTTPTransfer.h>
#include <corvane/Transfer/TransferError.h>

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

namespace corvane {

/// A transfer while it runs: the handle, the open body file and what has come back so far. Lives on the transfer
/// thread.
class CurlTransfer {
  public:
    using Clock = std::chrono::steady_clock;

    struct EasyDeleter {
        void operator()(void* easy) const noexcept;
    };
    /// Each transfer has one of its own. One that was set back for another transfer keeps a pointer, in libcurl 7.88,
    /// to the last field of the answer before; it is read when the next answer begins with a folded line.
    using Easy = std::unique_ptr<void, EasyDeleter>;

    /// While it lives, the system drops what it has still to send on a connection that this thread has curl close: it
    /// would go out to the last byte.
    class UnsentIsDropped {
      public:
        UnsentIsDropped() noexcept;
        UnsentIsDropped(const UnsentIsDropped&) = delete;
        UnsentIsDropped& operator=(const UnsentIsDropped&) = delete;
        ~UnsentIsDropped();
    };

    /// Opens the body file and sets a handle up. Throws `TransferError`.
    explicit CurlTransfer(const HTTPTransfer& transfer);
    CurlTransfer(const CurlTransfer&) = delete;
    CurlTransfer& operator=(const CurlTransfer&) = delete;
    ~CurlTransfer();

    [[nodiscard]] void* handle() const { return easy_.get(); }

    /// Looks at how far the transfer has come: reports what was sent, and moves the deadline when a byte went either
    /// way.
    void update(Clock::time_point now);
    /// When the transfer is over unless it ends, or something moves, before.
    [[nodiscard]] Clock::time_point deadline() const { return std::min(deadline_, answerDeadline_); }

    /// What a transfer that ended with a curl result code comes to.
    [[nodiscard]] std::optional<AnyError> error(int curlCode) const;
    /// What a transfer that reached its deadline comes to; nothing when it may end with the answer it has.
    [[nodiscard]] std::optional<AnyError> timeoutError() const;
    /// The answer's head, once it is in whole.
    [[nodiscard]] std::optional<TransferResponse> response() const;

  private:
    struct HeaderListDeleter {
        void operator()(void* list) const noexcept;
    };
    void openBody(const std::filesystem::path& file, bool mustBeOwn);
    void setTrust(const std::filesystem::path& certificates);
    void setProxy(const TransferProxy& proxy, bool isLoopback);
    [[nodiscard]] bool hasBegun() const;
    [[nodiscard]] TransferError failure(int curlCode) const;
    [[nodiscard]] bool isProxyRefusal() const;
    void setHeaders(const TransferRequest& request);
    void setOptions(const HTTPTransfer& transfer);
    void reportSent(std::int64_t sent) const noexcept;
    void takeHeader(std::string_view line);

    static int closeSocket(void* self, int socket) noexcept;
    static std::size_t readBody(char* buffer, std::size_t size, std::size_t count, void* self) noexcept;
    static int seekBody(void* self, std::int64_t offset, int origin) noexcept;
    static std::size_t headerArrived(char* data, std::size_t size, std::size_t count, void* self) noexcept;
    static std::size_t bodyArrived(char* data, std::size_t size, std::size_t count, void* self) noexcept;

    // Constant after construction.
    const TransferLimits limits_;
    const std::function<void(std::int64_t, std::int64_t)> didSend_;
    std::string proxy_;  // empty when there is none
    Descriptor body_;
    std::int64_t bodySize_ = 0;
    std::unique_ptr<void, HeaderListDeleter> headerList_;

    std::int64_t bodyRead_ = 0;
    std::int64_t reported_ = 0;
    std::int64_t activity_ = 0;
    Clock::time_point deadline_;
    Clock::time_point answerDeadline_ = Clock::time_point::max();
    std::string bodyProblem_;
    TransferResponse answer_;
    std::map<std::string, std::string> spellings_;  // of its header fields' names, by their lower case
    std::size_t headerBytes_ = 0;
    std::size_t answerBytes_ = 0;
    bool headComplete_ = false;
    bool capReached_ = false;
    char errorText_[256] = {};

    Easy easy_;  // the last member: it uses the others to its end
};

}  // namespace corvane
