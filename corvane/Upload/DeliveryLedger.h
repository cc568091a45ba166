#pragma once

#include <corvane/Platform/Mutex.h>
#include <corvane/Upload/DeliveryReport.h>

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>

namespace corvane {

/// The books of which document is still on its way, for whoever wants to wait for the last of them.
///
/// The batching processor enters a document before it hands it over, the upload manager says what became of it. Holds
/// one entry per document on its way; settled ones are folded into totals. Safe from any thread; nothing but `wait`
/// waits.
class DeliveryLedger {
  public:
    /// Each enumerator says what happens next with the document.
    enum class Outcome {
        delivered,  ///< nothing: the collector has it
        pending,    ///< it goes out again when a manager for its endpoint is next opened
        givenUp,    ///< nothing: it was refused or dropped
    };

    /// Enters a document that is about to be handed over. Entering one again changes nothing.
    void add(std::string_view identifier, std::int64_t events);
    /// Strikes out a document whose hand-over was refused. Harmless for one that is not there.
    void remove(std::string_view identifier);
    /// Enters a document of an earlier run, whose number of events is not known.
    void addEarlier(std::string_view identifier) { add(identifier, 0); }
    /// Settles a document, for good. Harmless for one that is not there.
    void settle(std::string_view identifier, Outcome outcome);

    /// Remembers the outcome of a document that is on its way, for `takeOutcome`. Returns false when it is not there
    /// (any more).
    bool follow(std::string_view identifier);
    void unfollow(std::string_view identifier);
    /// The outcome of a document that was followed, once, when there is one.
    [[nodiscard]] std::optional<Outcome> takeOutcome(std::string_view identifier);

    /// How things stand; what is on its way counts as pending.
    [[nodiscard]] DeliveryReport report() const;

    /// Waits until every document that was entered is settled, and at most until `deadline`; returns how things stand
    /// then. Documents entered meanwhile are waited for too.
    ///
    /// Requires: not on a queue that the settling needs: the access queue or a queue of the upload.
    DeliveryReport wait(std::chrono::steady_clock::time_point deadline) const;

  private:
    [[nodiscard]] DeliveryReport reportLocked() const CORVANE_REQUIRES(mutex_);

    mutable Mutex mutex_;
    mutable std::condition_variable settled_;
    std::map<std::string, std::int64_t, std::less<>> onTheirWay_
        CORVANE_GUARDED_BY(mutex_);                     // events by document identifier
    DeliveryReport totals_ CORVANE_GUARDED_BY(mutex_);  // of settled documents
    std::map<std::string, std::optional<Outcome>, std::less<>> followed_ CORVANE_GUARDED_BY(mutex_);
};

}  // namespace corvane
