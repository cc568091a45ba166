#include <corvane/Agent/Host/AgentLink.h>

#include <corvane/Platform/Error.h>
#include <corvane/Platform/Log.h>

#include <algorithm>
#include <cerrno>
#include <system_error>
#include <utility>

namespace corvane {

namespace {

using namespace std::chrono_literals;

constexpr auto betweenAttempts = 10ms;
// An agent that dies again and again without getting anything done is started less and less often.
constexpr auto longestRestartDelay = 2s;

}  // namespace

AgentLink::Way AgentLink::wayTo(AgentDirectory directory, std::filesystem::path program, TransferAgentOptions options) {
    return {.connect = [directory] { return directory.connect(); },
            .start =
                [directory, program = std::move(program), options = std::move(options)] {
                    const AgentDirectory whole(directory.path());
                    return AgentProgram::start(program, whole.path(), options);
                },
            .reap =
                [](pid_t process) {
                    agentThread.assertCurrent("AgentThread::reap");
                    AgentThread::shared().reap(process);
                }};
}

AgentLink::AgentLink(Way way, std::chrono::milliseconds deadline, agent::Hello hello, Clock::time_point now)
    : way_(std::move(way)), deadline_(deadline), hello_(std::move(hello)), giveUpAt_(now + deadline) {
    if (connect(now)) return;
    if (!way_.start) throw InvalidArgument(problem_);
    starter_ = way_.start();
}

AgentLink::~AgentLink() = default;

void AgentLink::send(agent::Request request, Clock::time_point now) {
    if (state_ != State::ready) return;
    const bool isAnswered = agent::isAnswered(request);
    socket_->send(agent::encode(std::move(request)));
    if (!isAnswered) return;
    if (outstanding_ == 0) lastHeard_ = now;
    ++outstanding_;
}

void AgentLink::retry(Clock::time_point now) {
    if (state_ != State::resting) return;
    state_ = State::connecting;
    giveUpAt_ = now + deadline_;
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
            if (outstanding_ > 0) return lastHeard_ + deadline_;
            return awaitsTasks_ ? lastHeard_ + 2 * deadline_ : Clock::time_point::max();
        case State::resting:
        case State::closed:
            break;
    }
    return Clock::time_point::max();
}

void AgentLink::attempt(Clock::time_point now) {
    try {
        if (connect(now)) return;
        if (!way_.start) return fail(problem_);
        starter_ = way_.start();
    } catch (const std::exception& error) {
        fail(error.what());
    }
}

bool AgentLink::connect(Clock::time_point now) {
    Descriptor connected = way_.connect();
    if (!connected) {
        problem_ = "no connection: " + std::system_category().message(errno);
        nextAttempt_ = now + betweenAttempts;
        return false;
    }
    socket_.emplace(std::move(connected));
    socket_->send(agent::encode(hello_));
    outstanding_ = 0;
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
    nextAttempt_ = now + std::min<std::chrono::milliseconds>(restartDelay_, deadline_ / 2);
}

void AgentLink::forgetStarter() {
    if (starter_.process > 0) way_.reap(starter_.process);
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

// An answer too many is no reason to stop: an agent that found a submission by itself has answered for it already.
void AgentLink::take(const agent::Reply& reply, Clock::time_point now) {
    lastHeard_ = now;
    if (const auto* welcome = std::get_if<agent::Welcome>(&reply)) return greeted(*welcome);
    const auto listener = listener_.lock();
    if (state_ != State::ready || !listener) return;
    if (agent::isAnswer(reply) && outstanding_ > 0) --outstanding_;
    const bool getsThingsDone =
        std::holds_alternative<agent::Accepted>(reply) || std::holds_alternative<agent::Completed>(reply);
    if (getsThingsDone) restartDelay_ = 0ms;
    listener->agentSaid(reply);
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

void AgentLink::checkDeadlines(Clock::time_point now) {
    if (state_ == State::connecting || state_ == State::greeting) {
        if (now >= giveUpAt_) fail(whyNot());
    } else if (state_ == State::ready && outstanding_ > 0) {
        if (now >= lastHeard_ + deadline_) fail("no answer in time");
    } else if (state_ == State::ready && awaitsTasks_ && now >= lastHeard_ + 2 * deadline_) {
        send(agent::Ping{}, now);
        static_cast<void>(socket_->flush());
    }
}

std::string AgentLink::whyNot() const {
    if (state_ == State::greeting) return "no answer in time";
    if (!starterProblem_.empty()) return starterProblem_;
    return problem_.empty() ? "no start in time" : problem_;
}

void AgentLink::lost(Clock::time_point now, const std::string& why) {
    const bool stood = state_ == State::ready;
    socket_.reset();
    state_ = State::connecting;
    nextAttempt_ = now + betweenAttempts;
    problem_ = why;
    if (!stood) return;  // an agent that ends just now, or a start that goes on until its deadline
    if (way_.start) Log::shared().error("Transfer agent was lost and is started again, error=%{public}@", why);
    waitLonger(now);
    giveUpAt_ = nextAttempt_ + deadline_;
}

void AgentLink::fail(const std::string& why) {
    socket_.reset();
    forgetStarter();
    state_ = State::resting;
    // Once for each reason: an agent of another version, say, may be in the way for as long as it has work.
    if (std::exchange(complaint_, why) != why && way_.start) {
        Log::shared().error("Transfer agent is not available, transfers go on inside the process, error=%{public}@",
                            why);
    }
    if (const auto listener = listener_.lock()) listener->agentFailed(why);
}

}  // namespace corvane
