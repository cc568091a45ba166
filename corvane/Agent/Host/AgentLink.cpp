#include <corvane/Agent/Host/AgentLink.h>

#include <corvane/Agent/Host/AgentThread.h>
#include <corvane/Platform/Error.h>
#include <corvane/Platform/Log.h>

#include <algorithm>
#include <cerrno>
#include <system_error>
#include <type_traits>
#include <utility>

namespace corvane {

namespace {

using namespace std::chrono_literals;

constexpr auto betweenAttempts = 10ms;
// An agent that dies again and again without getting anything done is started less and less often.
constexpr auto longestRestartDelay = 2s;

// One that cannot be read is a failed transfer, and no reason to leave the agent.
TransferOutcome readable(const std::string& bytes) {
    try {
        return TransferOutcome::decode(bytes);
    } catch (const InvalidArgument&) {
        return TransferOutcome::unreadable();
    }
}

}  // namespace

AgentLink::AgentLink(AgentDirectory directory, std::filesystem::path program, TransferAgentOptions options,
                     agent::Hello hello)
    : directory_(std::move(directory)),
      program_(std::move(program)),
      options_(std::move(options)),
      hello_(std::move(hello)) {
    const auto now = Clock::now();
    giveUpAt_ = now + options_.deadline;
    if (connect(now)) return;
    start();
}

AgentLink::~AgentLink() = default;

void AgentLink::start() {
    starter_ = AgentProgram::start(program_, directory_.path(), options_);
}

void AgentLink::send(agent::Request message, std::size_t answers) {
    if (state_ != State::ready) return;
    socket_->send(agent::encode(std::move(message)));
    if (outstanding_ == 0 && answers > 0) lastHeard_ = Clock::now();
    outstanding_ += answers;
}

void AgentLink::retry(Clock::time_point now) {
    if (state_ != State::resting) return;
    state_ = State::connecting;
    giveUpAt_ = now + options_.deadline;
    nextAttempt_ = now;
    restartDelay_ = 0ms;
    starterProblem_.clear();
    proceed(now);
}

void AgentLink::close() {
    if (socket_) static_cast<void>(socket_->flush());  // an acknowledgement that has not gone out yet
    socket_.reset();
    forgetStarter();
    state_ = State::closed;
}

void AgentLink::endOfProcess() {
    if (const auto listener = listener_.lock()) listener->processEnds();
    close();
}

void AgentLink::proceed(Clock::time_point now) {
    if (starter_.output) readStarter(now);
    if (state_ == State::connecting && !starter_.output && now >= nextAttempt_) attempt(now);
    if (socket_) exchange(now);
    checkDeadlines(now);
}

pollfd AgentLink::polled() const {
    if (starter_.output) return {starter_.output.get(), POLLIN, 0};
    if (!socket_) return {-1, 0, 0};
    return {socket_->descriptor(), static_cast<short>(POLLIN | (socket_->unsent() > 0 ? POLLOUT : 0)), 0};
}

AgentLink::Clock::time_point AgentLink::nextDeadline() const {
    switch (state_) {
        case State::connecting:
            return starter_.output ? giveUpAt_ : std::min(giveUpAt_, nextAttempt_);
        case State::greeting:
            return giveUpAt_;
        case State::ready:
            if (outstanding_ > 0) return lastHeard_ + options_.deadline;
            return awaitsTasks_ ? lastHeard_ + 2 * options_.deadline : Clock::time_point::max();
        case State::resting:
        case State::closed:
            break;
    }
    return Clock::time_point::max();
}

// The directory may have been removed meanwhile; the agent needs it whole.
void AgentLink::attempt(Clock::time_point now) {
    try {
        static_cast<void>(AgentDirectory(directory_.path()));
        if (connect(now)) return;
        start();
    } catch (const std::exception& error) {
        fail(error.what());
    }
}

bool AgentLink::connect(Clock::time_point now) {
    Descriptor connected = directory_.connect();
    if (!connected) {
        problem_ = "no connection: " + std::system_category().message(errno);
        nextAttempt_ = now + betweenAttempts;
        return false;
    }
    socket_.emplace(std::move(connected));
    socket_->send(agent::encode(hello_));
    outstanding_ = 0;
    listing_.clear();
    state_ = State::greeting;
    return true;
}

void AgentLink::readStarter(Clock::time_point now) {
    char buffer[512];
    while (true) {
        const ssize_t count = read(starter_.output.get(), buffer, sizeof buffer);
        if (count > 0 && starterSaid_.size() < sizeof buffer) starterSaid_.append(buffer, static_cast<size_t>(count));
        if (count > 0) continue;
        if (count < 0 && errno == EINTR) continue;
        if (count < 0 && errno == EAGAIN) return;
        break;
    }
    starterEnded(now);
}

// What an agent says beside "ready" is something that somebody should look into. One that cannot start is not started
// again at once: it would fail for the same reason.
void AgentLink::starterEnded(Clock::time_point now) {
    std::string said = std::move(starterSaid_);
    forgetStarter();
    while (said.ends_with('\n')) said.pop_back();
    const bool isReady = said.starts_with("ready");
    if (isReady && said != "ready") Log::shared().error("Transfer agent reports a problem, problem=%{public}@", said);
    if (connect(now) || isReady) return;
    starterProblem_ = said.empty() ? "the agent did not start" : said;
    waitLonger(now);
}

void AgentLink::waitLonger(Clock::time_point now) {
    restartDelay_ = std::clamp<std::chrono::milliseconds>(2 * restartDelay_, betweenAttempts, longestRestartDelay);
    nextAttempt_ = now + std::min<std::chrono::milliseconds>(restartDelay_, options_.deadline / 2);
}

void AgentLink::forgetStarter() {
    if (starter_.process > 0) AgentThread::shared().reap(starter_.process);
    starter_ = {};
    starterSaid_.clear();
}

void AgentLink::exchange(Clock::time_point now) {
    bool alive = socket_->receive();
    try {
        if (alive && state_ == State::greeting && !socket_->peerIsOwnUser()) {
            return fail("the socket is another user's");
        }
        while (socket_) {
            const auto message = socket_->next();
            if (!message) break;
            if (const auto reply = agent::decodeReply(*message)) take(*reply, now);
        }
    } catch (const std::exception& error) {  // also without memory: the agent says everything again
        return lost(now, error.what());
    }
    if (!socket_) return;
    alive = socket_->flush() && alive;
    if (!alive) lost(now, "the connection has ended");
}

void AgentLink::take(const agent::Reply& reply, Clock::time_point now) {
    lastHeard_ = now;
    const auto listener = listener_.lock();
    if (const auto* welcome = std::get_if<agent::Welcome>(&reply)) return greeted(*welcome);
    if (state_ != State::ready || !listener) return;
    std::visit(
        [&](const auto& one) {
            using One = std::remove_cvref_t<decltype(one)>;
            if constexpr (std::is_same_v<One, agent::Accepted>) {
                endExchange();
                restartDelay_ = 0ms;
                listener->agentAccepted(one.token);
            } else if constexpr (std::is_same_v<One, agent::Refused>) {
                endExchange();
                listener->agentRefused(one.token, one.reason);
            } else if constexpr (std::is_same_v<One, agent::Known>) {
                listing_.push_back({one.token, one.description});
            } else if constexpr (std::is_same_v<One, agent::Listed>) {
                endExchange();
                listener->agentListed(std::exchange(listing_, {}));
            } else if constexpr (std::is_same_v<One, agent::Progress>) {
                listener->agentProgressed(one.token, one.total, one.expected);
            } else if constexpr (std::is_same_v<One, agent::Completed>) {
                restartDelay_ = 0ms;
                listener->agentCompleted({one.token, one.description}, readable(one.outcome));
            } else if constexpr (std::is_same_v<One, agent::Forgotten>) {
                endExchange();
                listener->agentForgot(one.token);
            } else if constexpr (std::is_same_v<One, agent::Elsewhere>) {
                const auto outcome = one.outcome.empty() ? std::nullopt : std::optional(readable(one.outcome));
                listener->agentEndedElsewhere({one.token, one.description}, outcome);
            } else if constexpr (std::is_same_v<One, agent::Trouble>) {
                tell(one);
            } else if constexpr (std::is_same_v<One, agent::Unsupported>) {
                endExchange();
            } else if constexpr (std::is_same_v<One, agent::Flushed>) {
                listener->agentFlushed();
            } else if constexpr (std::is_same_v<One, agent::Pong>) {
                endExchange();
            }
        },
        reply);
}

void AgentLink::greeted(const agent::Welcome& welcome) {
    if (welcome.version != agent::protocolVersion) {
        return fail("the agent speaks version " + std::to_string(welcome.version) + " of the protocol");
    }
    state_ = State::ready;
    problem_.clear();
    starterProblem_.clear();
    complaint_.clear();
    if (const auto listener = listener_.lock()) listener->agentIsReady();
}

void AgentLink::tell(const agent::Trouble& trouble) {
    if (trouble.lasts) {
        Log::shared().error("Uploads wait for their server and are tried again, server=%{public}@, reason=%{public}@",
                            trouble.server, trouble.reason);
    } else {
        Log::shared().default_("Uploads to a server go on, server=%{public}@", trouble.server);
    }
}

// An answer too many is no reason to stop: an agent that found a submission by itself has answered for it already.
void AgentLink::endExchange() {
    if (outstanding_ > 0) --outstanding_;
}

void AgentLink::checkDeadlines(Clock::time_point now) {
    if (state_ == State::connecting || state_ == State::greeting) {
        if (now < giveUpAt_) return;
        fail(state_ == State::greeting  ? "no answer in time"
             : !starterProblem_.empty() ? starterProblem_
             : problem_.empty()         ? "no start in time"
                                        : problem_);
    } else if (state_ == State::ready && outstanding_ > 0 && now >= lastHeard_ + options_.deadline) {
        fail("no answer in time");
    } else if (state_ == State::ready && outstanding_ == 0 && awaitsTasks_ &&
               now >= lastHeard_ + 2 * options_.deadline) {
        send(agent::Ping{}, 1);
        static_cast<void>(socket_->flush());
    }
}

void AgentLink::lost(Clock::time_point now, const std::string& why) {
    const bool stood = state_ == State::ready;
    socket_.reset();
    state_ = State::connecting;
    nextAttempt_ = now + betweenAttempts;
    problem_ = why;
    if (!stood) return;  // an agent that ends just now, or a start that goes on until its deadline
    Log::shared().error("Transfer agent was lost and is started again, error=%{public}@", why);
    waitLonger(now);
    giveUpAt_ = nextAttempt_ + options_.deadline;
}

void AgentLink::fail(const std::string& why) {
    socket_.reset();
    forgetStarter();
    state_ = State::resting;
    // Once for each reason: an agent of another version, say, may be in the way for as long as it has work.
    if (std::exchange(complaint_, why) != why) {
        Log::shared().error("Transfer agent is not available, transfers go on inside the process, error=%{public}@",
                            why);
    }
    if (const auto listener = listener_.lock()) listener->agentFailed();
}

}  // namespace corvane
