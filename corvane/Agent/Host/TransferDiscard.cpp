#include <corvane/Agent/Host/TransferDiscard.h>

#include <corvane/Agent/Host/AgentLink.h>
#include <corvane/Agent/Host/AgentThread.h>
#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Platform/Error.h>
#include <corvane/Platform/HostCall.h>
#include <corvane/Platform/Mutex.h>

#include <algorithm>
#include <cerrno>
#include <memory>
#include <string>
#include <system_error>
#include <utility>
#include <variant>
#include <vector>

namespace corvane {

namespace {

using Status = DiscardResult::Status;
using Agents = std::vector<std::pair<std::string, std::chrono::milliseconds>>;  // directories, and deadlines

void add(Agents& agents, const std::string& directory, std::chrono::milliseconds deadline) {
    const auto isSame = [&](const auto& one) { return one.first == directory; };
    if (std::none_of(agents.begin(), agents.end(), isSame)) agents.emplace_back(directory, deadline);
}

struct Known {
    Mutex mutex;
    Agents used CORVANE_GUARDED_BY(mutex);
};

Known& known() {
    static auto& instance = *new Known;  // never destroyed: sessions may be opened while the process exits
    return instance;
}

Agents used() {
    Lock lock(known().mutex);
    return known().used;
}

// The agent of the documents directory may be another process's alone.
void addUsual(Agents& all) {
    std::error_code missing;
    const auto usual = std::filesystem::canonical(DocumentsDirectory::path() / AgentDirectory::usualName, missing);
    if (!missing) add(all, usual.string(), TransferAgentOptions().deadline);
}

// One call for all agents: tells what they made of it when the last of them has let go.
class Round {
  public:
    explicit Round(std::function<void(DiscardResult)> done) : done_(std::move(done)) {}
    Round(const Round&) = delete;
    Round& operator=(const Round&) = delete;
    ~Round() {
        callHost("discarded transfers", [this] { done_(std::move(result_)); });
    }

    void note(const DiscardResult& one) {
        result_.status = std::max(result_.status, one.status);
        result_.dropped += one.dropped;
        if (!one.problem.empty()) result_.problem = one.problem;
    }

  private:
    const std::function<void(DiscardResult)> done_;
    DiscardResult result_;
};

// What one agent is asked, over a connection of its own, which needs no owner's key. Holds itself until it has ended.
class Question final : public AgentLink::Listener, public std::enable_shared_from_this<Question> {
  public:
    Question(std::string bodiesBeneath, std::shared_ptr<Round> round)
        : bodiesBeneath_(std::move(bodiesBeneath)), round_(std::move(round)) {}

    void ask(const AgentDirectory& directory, std::chrono::milliseconds deadline) CORVANE_REQUIRES(agentThread) {
        const auto first = std::make_shared<Descriptor>(directory.connect());
        const int error = errno;
        if (!*first && (error == ENOENT || error == ECONNREFUSED)) return;
        const auto connect = [first, directory] { return *first ? std::exchange(*first, {}) : directory.connect(); };
        // The greeting has one half of the time, the answer the other.
        link_ = std::make_shared<AgentLink>(AgentLink::Way{connect, {}, {}}, deadline / 2,
                                            agent::Hello{.session = "discard", .owner = {}, .wakeCommand = {}},
                                            AgentLink::Clock::now());
        link_->setListener(weak_from_this());
        AgentThread::shared().adopt(link_);
        self_ = shared_from_this();
    }

    void agentIsReady() override CORVANE_REQUIRES(agentThread) {
        link_->send(agent::Discard{bodiesBeneath_}, AgentLink::Clock::now());
    }
    void agentSaid(const agent::Reply& reply) override CORVANE_REQUIRES(agentThread) {
        if (const auto* answer = std::get_if<agent::Discarded>(&reply)) end({Status::answered, answer->dropped, {}});
        if (std::holds_alternative<agent::Unsupported>(reply)) agentFailed("the agent is too old to discard tasks");
    }
    void agentFailed(const std::string& why) override CORVANE_REQUIRES(agentThread) { end({Status::failed, 0, why}); }
    void processEnds() override CORVANE_REQUIRES(agentThread) { agentFailed("the process exits"); }

  private:
    void end(const DiscardResult& result) CORVANE_REQUIRES(agentThread) {
        const auto self = std::exchange(self_, nullptr);
        if (!self) return;
        round_->note(result);
        link_->close();
    }

    const std::string bodiesBeneath_;
    const std::shared_ptr<Round> round_;
    std::shared_ptr<AgentLink> link_ CORVANE_GUARDED_BY(agentThread);
    std::shared_ptr<Question> self_ CORVANE_GUARDED_BY(agentThread);
};

}  // namespace

void TransferDiscard::noteDirectory(const AgentDirectory& directory, std::chrono::milliseconds deadline) {
    Lock lock(known().mutex);
    add(known().used, directory.path().string(), deadline);
}

namespace {

void ask(const std::string& beneath, const std::shared_ptr<Round>& round, const std::string& directory,
         std::chrono::milliseconds deadline) CORVANE_REQUIRES(agentThread) {
    try {
        if (!std::filesystem::is_directory(directory)) return;
        std::make_shared<Question>(beneath, round)->ask(AgentDirectory(directory), deadline);
    } catch (const std::exception& error) {
        round->note({Status::failed, 0, error.what()});
    }
}

}  // namespace

void TransferDiscard::start(std::filesystem::path bodiesBeneath, std::function<void(DiscardResult)> done) {
    AgentThread::shared().post([beneath = std::filesystem::absolute(bodiesBeneath).string(), done = std::move(done)] {
        agentThread.assertCurrent("TransferDiscard");
        const auto round = std::make_shared<Round>(done);
        Agents all;
        try {
            all = used();
            addUsual(all);
        } catch (const std::exception& error) {
            round->note({Status::failed, 0, error.what()});
        }
        for (const auto& [directory, deadline] : all) ask(beneath, round, directory, deadline);
    });
}

}  // namespace corvane
