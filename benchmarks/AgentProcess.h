#pragma once

#ifdef CORVANE_AGENT

#include "tests/support/Files.h"

#include <corvane/Agent/Host/BackgroundTransferSession.h>
#include <corvane/Testing/TemporaryDocuments.h>

#include <signal.h>

#include <cstdlib>
#include <ctime>
#include <memory>
#include <stdexcept>
#include <utility>

namespace corvane::bench {

/// An agent with a directory of its own, which is started by the first session and killed at the end.
class AgentProcess {
  public:
    AgentProcess() = default;
    AgentProcess(const AgentProcess&) = delete;
    AgentProcess& operator=(const AgentProcess&) = delete;
    ~AgentProcess() {
        if (const pid_t running = process()) kill(running, SIGKILL);
    }

    [[nodiscard]] TransferSession::Factory sessions() const {
        return
            [options = options_](const TransferSessionConfiguration& configuration,
                                 std::weak_ptr<TransferSessionDelegate> delegate, std::shared_ptr<SerialQueue> queue) {
                return std::make_shared<BackgroundTransferSession>(configuration, std::move(delegate), std::move(queue),
                                                                   options);
            };
    }
    [[nodiscard]] double cpuNanoseconds() const {
        clockid_t clock{};
        timespec time{};
        if (clock_getcpuclockid(process(), &clock) != 0 || clock_gettime(clock, &time) != 0) {
            throw std::runtime_error("there is no agent");
        }
        return static_cast<double>(time.tv_sec) * 1e9 + static_cast<double>(time.tv_nsec);
    }

  private:
    [[nodiscard]] pid_t process() const {
        return static_cast<pid_t>(std::atol(test::readFile(options_.directory / "agent.lock").c_str()));
    }

    const test::TemporaryDocuments documents_;
    const TransferAgentOptions options_{.program = CORVANE_AGENT, .directory = documents_ / "agent"};
};

}  // namespace corvane::bench

#endif
