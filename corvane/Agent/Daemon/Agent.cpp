#include <corvane/Agent/Daemon/Agent.h>

#include <corvane/Agent/Daemon/WakeUp.h>
#include <corvane/Agent/TransferOutcome.h>
#include <corvane/Platform/Error.h>
#include <corvane/Platform/PrivateFile.h>
#include <corvane/Transfer/TransferError.h>

#include <fcntl.h>
#include <poll.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <exception>
#include <limits>
#include <utility>

namespace corvane::transferd {

namespace {

using namespace std::chrono_literals;

// A host that has started the agent, or lost it, is about to connect.
constexpr auto beforeWaking = 500ms;
// What the system refuses now it may grant later.
constexpr auto beforeAcceptingAgain = 100ms;
constexpr auto beforeSettlingAgain = 100ms;
constexpr auto longestSettleDelay = std::chrono::milliseconds(10s);

// A submission as a host has left it. Throws for anything that no host of this user can have put there.
TransferSubmission readSubmission(const std::filesystem::path& file) {
    const Descriptor opened(open(file.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
    struct stat status {};
    if (!opened || fstat(opened.get(), &status) != 0) throw SystemError("read " + file.string(), errno);
    if (!S_ISREG(status.st_mode) || status.st_uid != geteuid()) throw InvalidArgument("not a file of this user");
    if (status.st_size > static_cast<off_t>(TransferSubmission::longest)) throw InvalidArgument("too long");
    std::string bytes(static_cast<std::size_t>(status.st_size), '\0');
    const ssize_t count = read(opened.get(), bytes.data(), bytes.size());
    if (count != status.st_size) throw InvalidArgument("the submission cannot be read whole");
    return TransferSubmission::decode(bytes);
}

}  // namespace

Agent::Agent(const AgentDirectory& directory, Journal& journal, const Options& options)
    : directory_(directory),
      options_(options),
      book_(journal),
      queue_(*this, options.retryDelay),
      clients_(*this),
      listener_(directory.listen()),
      watch_(directory) {
    removeAbandonedPartialFiles(directory_.spool());
    book_.load([this](std::int64_t number, const TransferSubmission& submission) { enqueue(number, submission); });
}

std::int64_t Agent::milliseconds() {
    return std::chrono::duration_cast<std::chrono::milliseconds>(std::chrono::system_clock::now().time_since_epoch())
        .count();
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
    if (std::exchange(spoolChanged_, false)) {
        dropWithdrawn();
        importSpool();
    }
    const auto now = Clock::now();
    queue_.proceed(now);
    reportProgress();
    settleEnded();
    settleJournal(now);
    deliver();
    answerFlushes();
    wakeHosts(now);
    clients_.dismissStrangers(now);
    clients_.flush();
    if (std::exchange(ownersChanged_, false)) {
        book_.dropOwners([this](const Owner& owner) { return hasClient(owner); });
    }
}

void Agent::waitForNews() {
    if (!listener_) listener_ = directory_.listen();
    const auto now = Clock::now();
    if (acceptsAgainAt_ && now >= *acceptsAgainAt_) acceptsAgainAt_.reset();
    std::vector<pollfd> polled{{acceptsAgainAt_ ? -1 : listener_.get(), POLLIN, 0}, {watch_.descriptor(), POLLIN, 0}};
    const std::size_t own = polled.size();
    clients_.appendTo(polled);
    const bool isAwaited = spoolChanged_;
    queue_.wait(polled, isAwaited ? 0 : std::min(queue_.millisecondsToDeadline(now), millisecondsToTimer(now)));
    if (polled[1].revents != 0) {
        isRemoved_ = !watch_.take();
        spoolChanged_ = true;
    }
    clients_.proceed(std::span(polled).subspan(own));
    if (polled[0].revents != 0 && !clients_.accept(listener_.get())) {
        acceptsAgainAt_ = Clock::now() + beforeAcceptingAgain;
    }
}

// --- Submissions. ----------------------------------------------------------------------------------------------------

// One that cannot be read stays nobody's: its host has not been told that it was accepted.
void Agent::importSpool() {
    for (const auto& token : directory_.spooled()) {
        try {
            import(token);
        } catch (const std::exception&) {
        }
    }
}

// Removes the submission once the journal has it, or once it is clear that it never will.
std::int64_t Agent::import(const std::string& token) {
    const auto file = directory_.submission(token);
    if (const auto known = book_.find(token)) {
        unlink(file.c_str());
        return *known;
    }
    TransferSubmission submission;
    try {
        submission = readSubmission(file);
        if (submission.token != token) throw InvalidArgument("the submission is another task's");
        TransferSubmission::checkNames(submission.session, submission.owner, submission.wakeCommand);
    } catch (const InvalidArgument&) {
        unlink(file.c_str());
        throw;
    }
    const auto number = book_.add(submission, milliseconds());
    if (unlink(file.c_str()) != 0) spoolChanged_ = true;  // taken back in this moment
    book_.setWakeCommand(*book_.task(number).owner, submission.wakeCommand, milliseconds());
    enqueue(number, submission);
    return number;
}

void Agent::enqueue(std::int64_t number, const TransferSubmission& submission) {
    try {
        if (const auto* trouble = queue_.add(number, submission)) tell(*book_.task(number).owner, *trouble);
    } catch (const TransferError&) {
        book_.finish(number, TransferOutcome::of(AnyError::current(), std::nullopt));
    }
}

// What a host has taken back it sends itself; nobody waits for the agent's word on it.
void Agent::dropWithdrawn() {
    for (const auto& token : directory_.withdrawn()) {
        if (const auto number = book_.find(token)) {
            queue_.remove(*number);
            forget(*number, nullptr);
        }
        unlink(directory_.submission(token).c_str());
        directory_.removeMark(token);
    }
}

// Whoever else waits for the task hears how it ended, or that its host has taken it back.
void Agent::forget(std::int64_t number, const Client* reporter) {
    const Owner* owner = book_.task(number).owner;
    for (auto& client : clients_.all()) {
        client.told.erase(number);
        if (&client != reporter && client.owner == owner) client.send(elsewhere(number));
    }
    book_.forget(number);
    ownersChanged_ = true;
}

agent::Elsewhere Agent::elsewhere(std::int64_t number) {
    agent::Elsewhere message{book_.task(number).token, std::nullopt, {}};
    const bool isOver = book_.task(number).owner->over.contains(number);
    try {
        message.description = book_.description(number);
        if (isOver) message.outcome = book_.outcome(number);
    } catch (const InvalidArgument&) {  // the journal cannot be read
        if (isOver) message.outcome = TransferOutcome::unreadable().encoded();
    }
    return message;
}

std::optional<HTTPTransfer> Agent::transfer(std::int64_t number) {
    if (directory_.isWithdrawn(book_.task(number).token)) {
        spoolChanged_ = true;
        return std::nullopt;
    }
    TransferSubmission submission = book_.submission(number);
    HTTPTransfer transfer;
    transfer.pool = UploadQueue::pool(submission);
    transfer.request = std::move(submission.request);
    transfer.bodyFile = std::move(submission.file);
    transfer.bodyMustBeOwn = true;
    transfer.limits = submission.limits;
    transfer.proxy = std::move(submission.proxy);
    transfer.trustedCertificates = std::move(submission.trustedCertificates);
    return transfer;
}

bool Agent::mayWait(std::int64_t number) {
    return milliseconds() < book_.task(number).expires;
}

// --- Waking, and the end. -------------------------------------------------------------------------------------------

void Agent::settleEnded() {
    for (auto& all = queue_.ended(); !all.empty(); all.pop_front()) {
        const auto& ended = all.front();
        if (book_.contains(ended.number)) book_.finish(ended.number, TransferOutcome::of(ended.error, ended.response));
    }
}

// A full disk has room again some time, and nobody says when.
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

bool Agent::hasClient(const Owner& owner) const {
    return std::any_of(clients_.all().begin(), clients_.all().end(),
                       [&](const Client& client) { return client.owner == &owner; });
}

bool Agent::isDueToWake(const Owner& owner, Clock::time_point now) const {
    return !owner.over.empty() && !owner.isWoken && !owner.wakeCommand.empty() && !hasClient(owner) &&
           (owner.open.empty() || queue_.isStalled(now));
}

void Agent::wakeHosts(Clock::time_point now) {
    bool isDue = false;
    for (auto& [key, owner] : book_.owners()) isDue = isDue || isDueToWake(owner, now);
    if (!isDue) return wakesFrom_.reset();
    if (!wakesFrom_) wakesFrom_ = now + beforeWaking;
    if (now < *wakesFrom_) return;
    for (auto& [key, owner] : book_.owners()) {
        if (!isDueToWake(owner, now)) continue;
        auto command = owner.wakeCommand;
        command.push_back(owner.session);
        runDetached(command, options_.inherited);
        owner.isWoken = true;  // also when it could not be started: it would not be started the next moment either
    }
    wakesFrom_.reset();
}

int Agent::millisecondsToTimer(Clock::time_point now) {
    auto next = clients_.nextDismissal();
    if (idleSince_) next = std::min(next, *idleSince_ + options_.idleTime);
    if (aloneSince_) next = std::min(next, *aloneSince_ + options_.patienceWithoutHost);
    for (const auto& timer : {wakesFrom_, acceptsAgainAt_, settlesAgainAt_}) {
        if (timer) next = std::min(next, *timer);
    }
    if (next == Clock::time_point::max()) return std::numeric_limits<int>::max();
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(next - now).count();
    return static_cast<int>(std::clamp<std::int64_t>(left, 0, std::numeric_limits<int>::max()));
}

bool Agent::isIdle(Clock::time_point now) {
    if (!queue_.isEmpty() || clients_.hasGuests() || wakesFrom_ || !book_.isSettled()) {
        idleSince_.reset();
        return false;
    }
    if (!idleSince_) idleSince_ = now;
    return now >= *idleSince_ + options_.idleTime;
}

// Also while the journal takes nothing: then nothing that this one does is of use to the next.
bool Agent::isAlone(Clock::time_point now) {
    const bool isStuck = queue_.isHopeless() || (queue_.isEmpty() && !book_.isSettled());
    if (clients_.hasGuests() || !isStuck) {
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
    importSpool();
    if (queue_.isEmpty() || (aloneSince_ && book_.size() <= before)) return true;
    idleSince_.reset();
    aloneSince_.reset();
    return false;
}

}  // namespace corvane::transferd
