#include <corvane/Agent/Daemon/Agent.h>

#include <corvane/Agent/Daemon/WakeUp.h>
#include <corvane/Agent/Daemon/WallClock.h>
#include <corvane/Platform/GZIPFile.h>
#include <corvane/Platform/PrivateFile.h>
#include <corvane/Transfer/TransferError.h>

#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <exception>
#include <limits>
#include <string>
#include <utility>

namespace corvane::transferd {

namespace {

using namespace std::chrono_literals;

// What the system refuses now it may grant later.
constexpr auto beforeAcceptingAgain = 100ms;
constexpr auto beforeSettlingAgain = 100ms;
constexpr auto longestSettleDelay = std::chrono::milliseconds(10s);

// The journal may have outlived a power cut that the body has not.
void checkBody(const TransferSubmission& submission) {
    const auto& headers = submission.request.headers;
    const bool isPacked = std::any_of(headers.begin(), headers.end(), [](const auto& header) {
        return header.first == "Content-Encoding" && header.second == "gzip";
    });
    if (!isPacked || !isDamagedGZIPFile(submission.bodyPath)) return;
    throw TransferError(TransferError::Code::bodyUnavailable, submission.bodyPath + " is damaged");
}

}  // namespace

Agent::Agent(const AgentDirectory& directory, Journal& journal, const Options& options)
    : directory_(directory),
      options_(options),
      book_(journal),
      queue_(*this, options.retryDelay),
      intake_(directory, book_, queue_),
      desk_(book_, queue_, intake_),
      waker_([this](const std::vector<std::string>& command) { runDetached(command, options_.inherited); }),
      listener_(directory.listen()),
      watch_(directory) {
    removeAbandonedPartialFiles(directory_.spoolPath());
    intake_.load();
}

// An agent that has no memory, or no descriptor, for a moment goes on with the next round; what it could not finish is
// still there.
void Agent::run() {
    while (!isRemoved_ && !book_.isDamaged()) {
        try {
            round();
            const auto now = Clock::now();
            if ((isIdle(now) || isAlone(now)) && endsNow()) break;
            waitForNews();
        } catch (const std::exception&) {
            poll(nullptr, 0, static_cast<int>(std::chrono::milliseconds(beforeAcceptingAgain).count()));
        }
    }
    book_.settle();
    directory_.removeSocket();
}

void Agent::round() {
    if (intake_.takeChange()) {
        dropWithdrawn();
        intake_.acceptSpooled();
    }
    const auto now = Clock::now();
    queue_.proceed(now);
    completeEnded();
    settleJournal(now);
    desk_.deliver();
    wakeHosts(now);
    desk_.clients().dismissStrangers(now);
    desk_.clients().flush();
    desk_.dropOwners();
}

void Agent::waitForNews() {
    if (!listener_) listener_ = directory_.listen();
    const auto now = Clock::now();
    if (acceptsAgainAt_ && now >= *acceptsAgainAt_) acceptsAgainAt_.reset();
    std::vector<pollfd> polled{{acceptsAgainAt_ ? -1 : listener_.get(), POLLIN, 0}, {watch_.descriptor(), POLLIN, 0}};
    const std::size_t own = polled.size();
    desk_.clients().appendTo(polled);
    const bool isAwaited = intake_.isChanged();
    queue_.wait(polled, isAwaited ? 0 : std::min(queue_.millisecondsToDeadline(now), millisecondsToTimer(now)));
    if (polled[1].revents != 0) {
        isRemoved_ = !watch_.take();
        intake_.noteChange();
    }
    desk_.clients().proceed(std::span(polled).subspan(own));
    if (polled[0].revents != 0 && !desk_.clients().accept(listener_.get())) {
        acceptsAgainAt_ = Clock::now() + beforeAcceptingAgain;
    }
}

// A mark stays until the journal has let go of its task: an agent that is killed in between finds it.
void Agent::dropWithdrawn() {
    const auto withdrawn = directory_.withdrawn();
    for (const auto& token : withdrawn) {
        if (const auto number = book_.find(token)) desk_.drop(*number);
        unlink(directory_.submissionPath(token).c_str());
    }
    if (!book_.settle()) return;
    for (const auto& token : withdrawn) directory_.removeMark(token);
}

// --- For the upload queue. -------------------------------------------------------------------------------------------

std::optional<HTTPTransfer> Agent::transfer(std::int64_t number) {
    if (directory_.isWithdrawn(book_.task(number).token)) {
        intake_.noteChange();
        return std::nullopt;
    }
    TransferSubmission submission = book_.submission(number);
    if (intake_.isEarlier(number)) checkBody(submission);
    HTTPTransfer transfer;
    transfer.request = std::move(submission.request);
    transfer.bodyPath = std::move(submission.bodyPath);
    transfer.bodyMustBeOwn = true;
    transfer.limits = submission.limits;
    transfer.proxy = std::move(submission.proxy);
    transfer.trustedCertificates = std::move(submission.trustedCertificates);
    return transfer;
}

bool Agent::mayWait(std::int64_t number) {
    return wallClock() < book_.task(number).expires;
}

void Agent::troubleChanged(const UploadQueue::Trouble& trouble, const std::vector<std::int64_t>& uploads) {
    desk_.tell(trouble, uploads);
}

void Agent::completeEnded() {
    for (auto& all = queue_.ended(); !all.empty(); all.pop_front()) {
        const auto& ended = all.front();
        if (book_.contains(ended.number)) book_.complete(ended.number, ended.outcome);
    }
}

// --- Waking, and the end. --------------------------------------------------------------------------------------------

void Agent::settleJournal(Clock::time_point now) {
    if (book_.isSettled() || (settlesAgainAt_ && now < *settlesAgainAt_)) return;
    if (book_.settle()) {
        settlesAgainAt_.reset();
        settleDelay_ = 0ms;
        return;
    }
    settleDelay_ = std::clamp<std::chrono::milliseconds>(2 * settleDelay_, beforeSettlingAgain, longestSettleDelay);
    settlesAgainAt_ = now + settleDelay_;
}

void Agent::wakeHosts(Clock::time_point now) {
    const auto isComplete = [&](const TaskBook::Owner& owner) {
        return !desk_.hasClient(owner) && (owner.open.empty() || queue_.isStalled(now));
    };
    waker_.proceed(book_, isComplete, now);
}

int Agent::millisecondsToTimer(Clock::time_point now) const {
    auto next = desk_.clients().nextDismissal();
    if (idleSince_) next = std::min(next, *idleSince_ + options_.idleTime);
    if (aloneSince_) next = std::min(next, *aloneSince_ + options_.patienceWithoutHost);
    for (const auto& timer : {waker_.due(), acceptsAgainAt_, settlesAgainAt_}) {
        if (timer) next = std::min(next, *timer);
    }
    if (next == Clock::time_point::max()) return std::numeric_limits<int>::max();
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(next - now).count();
    return static_cast<int>(std::clamp<std::int64_t>(left, 0, std::numeric_limits<int>::max()));
}

bool Agent::isIdle(Clock::time_point now) {
    if (!queue_.isEmpty() || desk_.clients().hasGuests() || waker_.due() || !book_.isSettled()) {
        idleSince_.reset();
        return false;
    }
    if (!idleSince_) idleSince_ = now;
    return now >= *idleSince_ + options_.idleTime;
}

// Also while the journal takes nothing: then nothing that this one does is of use to the next.
bool Agent::isAlone(Clock::time_point now) {
    const bool isStuck = queue_.isHopeless() || (queue_.isEmpty() && !book_.isSettled());
    if (desk_.clients().hasGuests() || !isStuck) {
        aloneSince_.reset();
        return false;
    }
    if (!aloneSince_) aloneSince_ = now;
    return now >= *aloneSince_ + options_.patienceWithoutHost;
}

// A host that comes in this moment finds no socket, and starts an agent that waits for this one's lock; a submission
// that it left before is still seen here.
bool Agent::endsNow() {
    const std::size_t before = book_.size();
    directory_.removeSocket();
    listener_ = Descriptor();
    dropWithdrawn();
    intake_.acceptSpooled();
    if (queue_.isEmpty() || (aloneSince_ && book_.size() <= before)) return true;
    idleSince_.reset();
    aloneSince_.reset();
    return false;
}

}  // namespace corvane::transferd
