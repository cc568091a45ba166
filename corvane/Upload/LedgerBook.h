#pragma once

#include <corvane/Platform/Mutex.h>
#include <corvane/Upload/Ledger.h>
#include <corvane/Upload/LedgerEntry.h>

#include <cstdint>
#include <map>

namespace corvane {

/// An endpoint's ledger as this process knows it: what is on disk as of the last look, with all that this process has
/// changed since, and what is not on disk yet. One for each batching processor. Safe from any thread; nothing waits.
/// Internal.
class LedgerBook {
  public:
    /// What a transaction changes on disk.
    struct Changes {
        std::map<LedgerEntry, Ledger::Count> totals;
        Ledger::Count waiting;  // in documents
        std::int64_t waitingBytes = 0;
    };

    /// What the processor has itself: as of the end of a run of submissions.
    struct Batches {
        Ledger::Count open;          // in its own open batches
        std::int64_t openBytes = 0;  // of their text
        std::int64_t accepted = 0;   // events of this run, and what became of them:
        std::int64_t handedOver = 0;
        std::int64_t forgotten = 0;
    };

    [[nodiscard]] Ledger ledger() const;
    /// The bytes of payloads and of the text of batches.
    [[nodiscard]] std::int64_t bytesOnDisk() const;

    void setBatches(const Batches& batches);
    /// What is on disk now, but for batches.
    void setStored(const Changes& stored);
    /// Of payloads alone.
    [[nodiscard]] std::int64_t waitingBytes() const;
    /// Payloads hold so much more than their rows say, which whatever is read of rows leaves as it is.
    void setUncountedBytes(std::int64_t bytes);
    void addUncountedBytes(std::int64_t bytes);
    /// What there is in batches of earlier runs and other processes, and what has come to it or, negative, gone.
    void setOpenOfOthers(const Ledger::Count& count, std::int64_t bytes);
    void addOpenOfOthers(const Ledger::Count& count, std::int64_t bytes);
    /// Changes a total that no row stands for: it is on disk with the next transaction.
    void addLater(LedgerEntry entry, const Ledger::Count& count);
    /// What is to be written with the transaction that begins; `changes` of that transaction itself are among it from
    /// now on. Its end says `didWrite`, before another one begins.
    [[nodiscard]] std::map<LedgerEntry, Ledger::Count> write(const Changes& changes);
    /// Whether nothing is in memory alone.
    [[nodiscard]] bool isWritten() const;
    void didWrite(bool isCommitted);

  private:
    mutable Mutex mutex_;
    Changes stored_ CORVANE_GUARDED_BY(mutex_);
    std::int64_t uncountedBytes_ CORVANE_GUARDED_BY(mutex_) = 0;
    Ledger::Count openOfOthers_ CORVANE_GUARDED_BY(mutex_);
    std::int64_t openBytesOfOthers_ CORVANE_GUARDED_BY(mutex_) = 0;
    Batches batches_ CORVANE_GUARDED_BY(mutex_);
    std::map<LedgerEntry, Ledger::Count> unwritten_ CORVANE_GUARDED_BY(mutex_);
    // By the transaction under way: of its own, and of `unwritten_`.
    Changes changing_ CORVANE_GUARDED_BY(mutex_);
    std::map<LedgerEntry, Ledger::Count> writing_ CORVANE_GUARDED_BY(mutex_);
};

}  // namespace corvane
