#include "tests/Agent/AgentFixture.h"
#include "tests/support/Outcome.h"

#include <signal.h>
#include <unistd.h>

namespace corvane::test {

std::map<std::string, int> bodies(const ScriptedServer& server) {
    std::map<std::string, int> counts;
    for (const auto& request : server.requests()) ++counts[request.body];
    return counts;
}

void SessionRecorder::note(Outcomes& where, const TransferTask& task, const std::optional<AnyError>& error,
                           const std::optional<TransferResponse>& response) {
    std::lock_guard lock(mutex_);
    where[task.description().value_or("none")] += outcome(error, response);
    ++completed_;
    changed_.notify_all();
}

void SessionRecorder::allEventsDelivered() {
    std::lock_guard lock(mutex_);
    EXPECT_FALSE(completedAtSignal_);
    completedAtSignal_ = completed_;
    changed_.notify_all();
}

bool SessionRecorder::wait(std::size_t count) const {
    std::unique_lock lock(mutex_);
    return changed_.wait_for(lock, 20s, [&] { return completed_ >= count; });
}

std::optional<std::size_t> SessionRecorder::waitForSignal() const {
    std::unique_lock lock(mutex_);
    changed_.wait_for(lock, 20s, [&] { return completedAtSignal_.has_value(); });
    return completedAtSignal_;
}

AgentFixture::AgentFixture() {
    options.program = CORVANE_AGENT;
    options.directory = documents / "agent";
    options.idleTime = 20s;  // a test that stalls does not lose its agent, and one that is killed does not leave it
    options.retryDelay = 20ms;
}

AgentFixture::~AgentFixture() {
    end(options.directory);
}

std::shared_ptr<TransferSession> AgentFixture::open(const std::shared_ptr<SessionRecorder>& to,
                                                    const std::string& owner) {
    const TransferSessionConfiguration configuration{
        .identifier = "session", .ownerKey = owner, .relaunchesForEvents = true};
    return std::make_shared<BackgroundTransferSession>(configuration, to, nullptr, options);
}

std::shared_ptr<TransferTask> AgentFixture::upload(TransferSession& session, const std::string& url,
                                                   const std::string& description, const std::string& contents) {
    auto task = session.uploadTask({.url = url, .method = "PUT", .headers = {{"X-Task", description}}},
                                   body("body " + description, contents.empty() ? description : contents));
    task->setDescription(description);
    task->resume();
    return task;
}

std::vector<std::string> AgentFixture::running(TransferSession& session) {
    auto answer = std::make_shared<std::promise<std::vector<std::string>>>();
    session.tasks([answer](const auto& tasks) {
        std::vector<std::string> found;
        for (const auto& task : tasks) {
            if (task->state() == TransferTask::State::running) found.push_back(task->description().value_or("none"));
        }
        answer->set_value(found);
    });
    auto listed = answer->get_future();
    if (listed.wait_for(20s) != std::future_status::ready) return {"no answer"};
    return listed.get();
}

std::filesystem::path AgentFixture::body(const std::string& name, const std::string& contents) {
    writeFile(documents / name, contents);
    return documents / name;
}

std::size_t AgentFixture::processes(const std::string& arguments) {
    const auto all = filesIn("/proc");
    return static_cast<std::size_t>(std::count_if(all.begin(), all.end(), [&](const auto& one) {
        return readFile(one / "cmdline").find(arguments) != std::string::npos;
    }));
}

long AgentFixture::agent(const std::filesystem::path& directory) {
    const long process = std::atol(readFile(directory / "agent.lock").c_str());
    if (process <= 0) return 0;
    const auto command = readFile("/proc/" + std::to_string(process) + "/cmdline");
    std::error_code gone;
    const auto real = std::filesystem::weakly_canonical(directory, gone).string();
    return command.find(real + '\0') == std::string::npos ? 0 : process;
}

void AgentFixture::kill(int signal) const {
    if (const long process = agent()) ::kill(static_cast<pid_t>(process), signal);
}

void AgentFixture::end(const std::filesystem::path& directory) {
    EXPECT_TRUE(eventually([&] {
        const long process = agent(directory);
        if (process > 0) ::kill(static_cast<pid_t>(process), SIGKILL);
        return process == 0;
    }));
}

}  // namespace corvane::test
