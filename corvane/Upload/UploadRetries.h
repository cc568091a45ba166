#pragma once

#include <corvane/Platform/Mutex.h>
#include <corvane/Platform/SerialQueue.h>
#include <corvane/Platform/Timer.h>
#include <corvane/Upload/Backlog.h>
#include <corvane/Upload/RetrySchedule.h>
#include <corvane/Upload/StoredUploads.h>
#include <corvane/Upload/UploadResult.h>

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <vector>

namespace corvane {

/// Sends again, while the process runs, what ended with a retry in it; for hosts that ask for that.
///
/// A pass takes all that waits, when the schedule says so, and hands it over a portion at a time; there is one at a
/// time, which is over when all that it has sent has ended. It goes on with a second portion once the server has
/// decided on a document, and sends no more when the first has failed as a whole, or the server asks to be left alone.
/// What ended elsewhere is left to the process that was told of it, and what no transfer of this run has ended, to the
/// next run.
///
/// Owned by an `UploadManager`. Its timer is the access queue's, its passes are on the manager's. Safe from any thread.
/// Internal.
class UploadRetries : public std::enable_shared_from_this<UploadRetries> {
  public:
    /// A document that the server was sent so often in one run waits for the next one: there is something about it.
    /// What did not reach the server does not count, so that no outage uses it up.
    static constexpr int maximumAttempts = 100;

    /// @param firstDelay as of the schedule
    /// @param queue the manager's
    UploadRetries(std::chrono::milliseconds firstDelay, std::shared_ptr<SerialQueue> queue,
                  std::shared_ptr<StoredUploads> stored);

    /// Whether this is the document's first retry of the run that counts, which is noted.
    [[nodiscard]] bool isFirstCounted(const UploadResult::Retry& retry);
    /// Uploads have ended, and their rows and the ledger say so.
    void end(const std::vector<UploadResult>& results);
    /// One has ended of which another process was told, or is to be forgotten.
    void endElsewhere(const std::string& identifier);

  private:
    struct Document {
        int attempts = 0;
        bool isCounted = false;    // in its row, in this run
        bool isWaiting = false;    // for the next pass
        bool isInPass = false;     // of the pass that runs
        std::uint64_t number = 0;  // in the order in which they came to wait
    };
    struct Pass {
        bool runs = false;
        std::size_t left = 0;
        bool hasFailed = false;
        bool isAnswered = false;  // the server has taken or refused a document meanwhile
        bool hasDelivered = false;
    };

    void begin();
    void sendPortionLater();
    void sendPortion() CORVANE_REQUIRES(*queue_);
    void noteRetry(const UploadResult::Retry& retry, std::vector<std::string>& exhausted) CORVANE_REQUIRES(mutex_);
    void setWaiting(Document& document, bool isWaiting) CORVANE_REQUIRES(mutex_);
    void leavePass(Document& document) CORVANE_REQUIRES(mutex_);
    /// Puts a document of the pass back to those that wait, at its place.
    void putBack(const std::string& identifier) CORVANE_REQUIRES(mutex_);
    void forget(const std::string& identifier) CORVANE_REQUIRES(mutex_);
    /// Goes on with the pass, or ends it, and sees to it that the next one comes.
    void proceed(bool isMoreReady) CORVANE_REQUIRES(mutex_);
    void setTimer() CORVANE_REQUIRES(mutex_);

    const std::shared_ptr<SerialQueue> queue_;
    const std::shared_ptr<StoredUploads> stored_;
    Backlog backlog_;  // of the pass

    Mutex mutex_;
    std::map<std::string, Document> documents_ CORVANE_GUARDED_BY(mutex_);  // that ended with a retry
    std::uint64_t lastNumber_ CORVANE_GUARDED_BY(mutex_) = 0;
    std::size_t waiting_ CORVANE_GUARDED_BY(mutex_) = 0;
    Pass pass_ CORVANE_GUARDED_BY(mutex_);
    RetrySchedule schedule_ CORVANE_GUARDED_BY(mutex_);
    Timer timer_ CORVANE_GUARDED_BY(mutex_);
    RetrySchedule::Time timerDue_ CORVANE_GUARDED_BY(mutex_);
};

}  // namespace corvane
