#pragma once

#include <corvane/Platform/Mutex.h>
#include <corvane/Upload/DeliveryNews.h>
#include <corvane/Upload/DeliveryReport.h>

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>

namespace corvane {

/// The books of which document is still on its way, for whoever wants to wait for the last of them, or to be told of
/// each as it happens.
///
/// The batching processor enters a document before it hands it over, the upload manager says what becomes of it. Holds
/// one entry per document on its way; settled ones are folded into totals. Safe from any thread; nothing but `wait`
/// waits.
///
/// The server is known to be unreachable from the moment a transfer ended for want of a (trusted) connection, for the
/// documents that were entered before; and while the transfer session says that it holds uploads up, for all of them.
/// That is forgotten when a server answers, part of a document goes out, or the session says that uploads go on, and
/// with the last document.
class DeliveryLedger {
  public:
    /// Each enumerator says what happens next with the document.
    enum class Outcome {
        delivered,  ///< nothing: the collector has it
        pending,  ///< it goes out again when a manager for its endpoint is next opened, or before if that is asked for
        givenUp,  ///< nothing: it was refused or dropped
    };

    /// Remembers documents that are settled as pending from now on: they may begin again in this run, and their outcome
    /// is then the later one. Nobody waits for them again.
    void keepPending();

    /// Enters a document that is about to be handed over. Entering one again changes nothing, nor does one that is
    /// pending.
    void add(std::string_view identifier, std::optional<std::int64_t> events);
    /// Strikes out a document whose hand-over was refused, or that is another process's by now. Harmless for one that
    /// is not there.
    void remove(std::string_view identifier);
    /// Enters a document of an earlier run, whose number of events is not known.
    void addEarlier(std::string_view identifier) { add(identifier, std::nullopt); }
    /// Notes that a document's transfer has been started, or is found to be under way. Harmless when it was noted, or
    /// for one that is not there, and so is the next.
    void begin(std::string_view identifier);
    /// Notes how many bytes of a document have gone out, and of how many.
    void progress(std::string_view identifier, std::int64_t sent, std::int64_t expected);
    /// Settles a document, for good unless it is pending and `keepPending` was called. The observer is told also of one
    /// that is not there, which is otherwise harmless.
    void settle(std::string_view identifier, Outcome outcome, const DeliveryUpdate::Cause& cause = {});
    /// The documents that are on their way.
    [[nodiscard]] std::set<std::string> unsettled();
    /// Notes that the transfer session holds all uploads up because their server cannot be reached, or no longer.
    void holdUp(bool lasts);

    /// Remembers the outcome of a document that is on its way, for `takeOutcome`. Returns false when it is not there
    /// (any more).
    bool follow(std::string_view identifier);
    void unfollow(std::string_view identifier);
    struct Settled {
        Outcome outcome = Outcome::pending;
        DeliveryUpdate::Cause cause;
    };
    /// The outcome of a document that was followed, once, when there is one.
    [[nodiscard]] std::optional<Settled> takeOutcome(std::string_view identifier);

    /// Who is told of documents as it happens.
    [[nodiscard]] const std::shared_ptr<DeliveryNews>& news() const { return news_; }

    /// How things stand; what is on its way counts as pending.
    [[nodiscard]] DeliveryReport report() const;

    /// Whether every document that was entered is settled.
    /// @param onlyWhileReachable leaving out documents of which it is known that their server cannot be reached
    [[nodiscard]] bool isSettled(bool onlyWhileReachable = false) const;

    /// Waits until every document that was entered is settled, and at most until `deadline`; returns how things stand
    /// then. Documents entered meanwhile are waited for too.
    /// @param onlyWhileReachable as with `isSettled`
    ///
    /// Requires: not on a queue that the settling needs: the access queue or a queue of the upload.
    DeliveryReport wait(std::chrono::steady_clock::time_point deadline, bool onlyWhileReachable = false) const;

  private:
    struct Document {
        std::optional<std::int64_t> events;
        std::uint64_t number;  // in the order in which they were entered
        bool isUnderWay = false;
    };
    using Documents = std::map<std::string, Document, std::less<>>;

    /// Puts an update in line for the observer, if there is one.
    /// @param document what is known of it; nullptr for one that was not entered here
    void tell(DeliveryUpdate::Step step, std::string_view identifier, const Document* document,
              const DeliveryUpdate::Cause& cause = {}, std::int64_t sent = 0, std::int64_t expected = 0) noexcept;
    /// What is known of a document, pending ones included; nullptr for one that was not entered here.
    [[nodiscard]] Document* find(std::string_view identifier) CORVANE_REQUIRES(mutex_);
    Documents::node_type strikeOut(Documents::iterator document) CORVANE_REQUIRES(mutex_);
    /// Enters an outcome in the books, for the document's events.
    void fold(Documents::iterator document, Outcome outcome) CORVANE_REQUIRES(mutex_);
    /// What the end of a transfer says of the server.
    void noteServer(DeliveryUpdate::Reason reason) CORVANE_REQUIRES(mutex_);
    [[nodiscard]] bool isSettledLocked(bool onlyWhileReachable) const CORVANE_REQUIRES(mutex_);
    [[nodiscard]] DeliveryReport reportLocked() const CORVANE_REQUIRES(mutex_);

    const std::shared_ptr<DeliveryNews> news_ = std::make_shared<DeliveryNews>();

    mutable Mutex mutex_;
    mutable std::condition_variable settled_;
    Documents onTheirWay_ CORVANE_GUARDED_BY(mutex_);
    Documents pending_ CORVANE_GUARDED_BY(mutex_);  // settled ones that may begin again; empty unless they are kept
    bool keepsPending_ CORVANE_GUARDED_BY(mutex_) = false;
    std::uint64_t lastNumber_ CORVANE_GUARDED_BY(mutex_) = 0;
    // The documents up to this number wait for a server that is known to be unreachable.
    std::uint64_t heldUpTo_ CORVANE_GUARDED_BY(mutex_) = 0;
    DeliveryReport totals_ CORVANE_GUARDED_BY(mutex_);  // of settled documents
    std::map<std::string, std::optional<Settled>, std::less<>> followed_ CORVANE_GUARDED_BY(mutex_);
};

}  // namespace corvane
