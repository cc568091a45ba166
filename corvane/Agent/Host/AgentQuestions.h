#pragma once

#include <corvane/Agent/AgentMessage.h>
#include <corvane/Transfer/TransferSession.h>

#include <cstdint>
#include <utility>
#include <vector>

namespace corvane {

/// What the host has asked its session and the agent has still to say: listings of tasks, and flushes. Lives on the
/// agent thread. Internal.
///
/// The agent answers every question for its tasks, in order; a listing is answered by the first one that was asked
/// after it came.
class AgentQuestions {
  public:
    using Listing = TransferSession::Listing;
    using Known = std::vector<agent::Known>;

    void add(Listing listing) { listings_.emplace_back(asked_ + 1, std::move(listing)); }
    /// A question goes out to the agent.
    void asked() { ++asked_; }
    /// A task of the answer that is coming in.
    void take(agent::Known task) { known_.push_back(std::move(task)); }
    /// The answer is in whole: its tasks.
    [[nodiscard]] Known answered();
    /// The listings that the answers so far will do for.
    [[nodiscard]] std::vector<Listing> takeAnswered();
    /// What was asked of a lost agent is not answered any more, and has to be asked again.
    void askAgain();
    /// All listings, where there is nobody to ask.
    [[nodiscard]] std::vector<Listing> takeAll();

    void addFlush() { ++flushes_; }
    [[nodiscard]] bool hasFlushes() const { return flushes_ > 0; }
    [[nodiscard]] int takeFlushes() { return std::exchange(flushes_, 0); }

  private:
    std::vector<std::pair<std::uint64_t, Listing>> listings_;  // with the question that answers them
    Known known_;
    std::uint64_t asked_ = 0;
    std::uint64_t answered_ = 0;
    int flushes_ = 0;
};

}  // namespace corvane
