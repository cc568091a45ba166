#include <corvane/Agent/Daemon/HostWaker.h>

#include <algorithm>

namespace corvane::transferd {

namespace {
constexpr auto beforeWaking = std::chrono::milliseconds(500);
}

void HostWaker::proceed(TaskBook& book, const IsComplete& isComplete, Clock::time_point now) {
    const auto isDue = [&](const TaskBook::Owner& owner) {
        return !owner.over.empty() && !owner.isWoken && !owner.wakeCommand.empty() && isComplete(owner);
    };
    auto& owners = book.owners();
    if (std::none_of(owners.begin(), owners.end(), [&](const auto& one) { return isDue(one.second); })) {
        return wakesFrom_.reset();
    }
    if (!wakesFrom_) wakesFrom_ = now + beforeWaking;
    if (now < *wakesFrom_) return;
    for (auto& [key, owner] : owners) {
        if (!isDue(owner)) continue;
        auto command = owner.wakeCommand;
        command.push_back(owner.session);
        run_(command);
        owner.isWoken = true;  // also when it could not be started: it would not be started the next moment either
    }
    wakesFrom_.reset();
}

}  // namespace corvane::transferd
