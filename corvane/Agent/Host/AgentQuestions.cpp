#include <corvane/Agent/Host/AgentQuestions.h>

namespace corvane {

AgentQuestions::Known AgentQuestions::answered() {
    ++answered_;
    return std::exchange(known_, {});
}

std::vector<AgentQuestions::Listing> AgentQuestions::takeAnswered() {
    std::vector<Listing> taken;
    std::erase_if(listings_, [&](auto& one) {
        const bool isAnswered = one.first <= answered_;
        if (isAnswered) taken.push_back(one.second);
        return isAnswered;
    });
    return taken;
}

void AgentQuestions::askAgain() {
    answered_ = asked_;
    known_.clear();
    for (auto& [question, listing] : listings_) question = asked_ + 1;
}

std::vector<AgentQuestions::Listing> AgentQuestions::takeAll() {
    askAgain();
    answered_ = ++asked_;
    return takeAnswered();
}

}  // namespace corvane
