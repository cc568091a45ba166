#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/Error.h>

#include <string>

namespace corvane {

/// Why a transfer ended without the answer it was made for.
class CORVANE_EXPORT TransferError : public Error {
  public:
    enum class Code {
        invalidRequest,   ///< the URL or a header cannot be sent; another attempt ends the same way
        bodyUnavailable,  ///< the body file is missing, not readable, or changed its size while it was sent
        timedOut,         ///< no byte went either way for as long as the limits allow
        network,          ///< the connection broke
        unreachable,      ///< no name or no connection: nothing was sent
        blocked,          ///< no trusted connection: a certificate that does not verify, a TLS handshake that fails, or
                          ///< a proxy that refuses; nothing of the body reached the server
        cancelled,        ///< `TransferTask::cancel` has stopped it; the server may have got the body all the same
    };

    TransferError(Code code, std::string message);
    TransferError(const TransferError&) = default;
    TransferError& operator=(const TransferError&) = default;
    ~TransferError() override;

    [[nodiscard]] Code value() const noexcept { return static_cast<Code>(code()); }
};

}  // namespace corvane
