#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>

namespace corvane {

/// One step of a document's delivery, as a delivery observer is told of it. A value.
///
/// A document is under way, may make progress, and has an outcome: delivered, deferred or given up. One that is
/// deferred is under way again with a later run, or later in this one where `retryDelay` is set. Of documents that
/// earlier runs or other processes have left the outcome may be all that is told.
struct DeliveryUpdate {
    enum class Step {
        underWay,   ///< taken over to be sent, and in its turn
        progress,   ///< part of it has gone out: see `bytesSent`
        delivered,  ///< the collector has it
        deferred,   ///< this attempt has failed: it is kept, and sent again
        givenUp,    ///< refused by the collector, or dropped: it will not arrive
    };

    /// What decided on an outcome. Later versions may know more of them.
    enum class Reason {
        none,             ///< there is no outcome yet
        answer,           ///< the server's answer: see `status`
        unreachable,      ///< no name or no connection: nothing was sent
        blocked,          ///< no trusted connection, or a proxy that refuses: nothing of the document was sent
        failed,           ///< the transfer failed otherwise
        tooManyAttempts,  ///< it was retried more often than is allowed
        payloadMissing,   ///< its payload file has gone, or is empty
        forgotten,        ///< what was recorded was to be forgotten
        tooOld,           ///< it was stored for longer than the configuration allows
        noRoom,           ///< more was stored than the configuration allows, and it was the oldest
        cancelled,        ///< its transfer was stopped, for one of the reasons above or by its owner
    };

    /// Why a document has its outcome.
    struct Cause {
        Reason reason = Reason::none;
        std::optional<std::int64_t> status = {};  ///< of HTTP, where there was an answer
        std::string problem = {};                 ///< in words, where a transfer failed
        bool operator==(const Cause&) const = default;
    };

    Step step = Step::underWay;
    std::string document;  ///< the identifier that the document carries in its metadata
    std::optional<std::int64_t> events =
        {};  ///< in the document; nothing where an earlier run or another process made it
    Cause cause = {};
    std::int64_t bytesSent = 0;      ///< of the compressed document, in this attempt; for `progress`
    std::int64_t bytesExpected = 0;  ///< the size of the compressed document; for `progress`

    bool operator==(const DeliveryUpdate&) const = default;
};

/// Whoever is told of deliveries as they happen.
using DeliveryObserver = std::function<void(const DeliveryUpdate&)>;

}  // namespace corvane
