#pragma once

#include <corvane/Agent/Host/AgentThread.h>

#include <set>
#include <string>

namespace corvane {

/// The tokens of tasks that the agents are to forget, and have not said that they have: what was reported here, and
/// what this process has taken over.
///
/// Of the whole process, so that a session that is opened while another one's acknowledgement is under way is not told
/// again. On the agent thread. Internal.
class Acknowledgements {
  public:
    /// Those of this process.
    static Acknowledgements& shared();

    void add(const std::string& token) CORVANE_REQUIRES(agentThread) { tokens_.insert(token); }
    void remove(const std::string& token) CORVANE_REQUIRES(agentThread) { tokens_.erase(token); }
    [[nodiscard]] bool contains(const std::string& token) const CORVANE_REQUIRES(agentThread) {
        return tokens_.contains(token);
    }

  private:
    std::set<std::string> tokens_ CORVANE_GUARDED_BY(agentThread);
};

}  // namespace corvane
