#pragma once

#include <corvane/Platform/Error.h>

#include <cstdint>
#include <string>
#include <string_view>

namespace corvane {

/// The compression of a payload failed. Domain "Corvane.GZIPError".
class GZIPError : public Error {
  public:
    enum Code {
        failed = 0,  ///< zlib refused; see status()
    };
    /// @param status the status code that zlib returned.
    GZIPError(Code code, std::int32_t status);
    GZIPError(const GZIPError&) = default;
    GZIPError& operator=(const GZIPError&) = default;
    ~GZIPError() override;

    [[nodiscard]] Code value() const noexcept { return static_cast<Code>(code()); }
    [[nodiscard]] std::int32_t status() const noexcept { return status_; }

  private:
    std::int32_t status_;
};

/// The bytes in gzip form, at the best compression. Nothing stays nothing, and what is in gzip form already comes back
/// as it is, so that compressing twice is harmless. Throws `GZIPError`, also for 4 GiB and more.
[[nodiscard]] std::string gzipCompressed(std::string_view bytes);

}  // namespace corvane
