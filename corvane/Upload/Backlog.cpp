#include <corvane/Upload/Backlog.h>

#include <iterator>
#include <utility>

namespace corvane {

void Backlog::add(const std::vector<std::string>& identifiers) {
    const Lock lock(mutex_);
    for (const auto& identifier : identifiers) waiting_.push_back(identifier);
}

std::vector<std::string> Backlog::take() {
    const Lock lock(mutex_);
    std::vector<std::string> taken;
    if (!isReady()) return taken;
    while (taken.size() < portion && !waiting_.empty()) {
        std::string next = std::move(waiting_.front());
        waiting_.pop_front();
        if (endedBefore_.contains(next)) continue;
        underWay_.insert(next);
        taken.push_back(std::move(next));
    }
    if (waiting_.empty()) endedBefore_.clear();
    return taken;
}

bool Backlog::isIdle() {
    const Lock lock(mutex_);
    return underWay_.empty();
}

std::vector<std::string> Backlog::takeBack() {
    const Lock lock(mutex_);
    std::vector<std::string> taken(std::move_iterator(waiting_.begin()), std::move_iterator(waiting_.end()));
    waiting_.clear();
    endedBefore_.clear();
    return taken;
}

bool Backlog::end(const std::string& identifier) {
    const Lock lock(mutex_);
    if (underWay_.erase(identifier) == 0 && !waiting_.empty()) endedBefore_.insert(identifier);
    return isReady();
}

}  // namespace corvane
