#include "Hub.h"

#include <utility>

namespace collector {

void Hub::publish(std::string text) {
    auto shared = std::make_shared<const std::string>(std::move(text));
    {
        const std::lock_guard lock(mutex_);
        bytes_ += shared->size();
        messages_.push_back({++latest_, std::move(shared)});
        while (messages_.size() > 1 && (messages_.size() > mostMessages || bytes_ > mostBytes)) {
            bytes_ -= messages_.front().text->size();
            messages_.pop_front();
        }
    }
    changed_.notify_all();
}

std::uint64_t Hub::beforeOldest() const {
    const std::lock_guard lock(mutex_);
    return latest_ - messages_.size();
}

std::uint64_t Hub::latest() const {
    const std::lock_guard lock(mutex_);
    return latest_;
}

std::optional<Hub::Message> Hub::next(std::uint64_t number, std::chrono::milliseconds timeout) const {
    std::unique_lock lock(mutex_);
    changed_.wait_for(lock, timeout, [&] { return isClosed_ || number < latest_; });
    if (isClosed_ || number >= latest_) return std::nullopt;
    const std::uint64_t oldest = latest_ - messages_.size() + 1;
    return messages_[number < oldest ? 0 : number + 1 - oldest];
}

void Hub::close() {
    {
        const std::lock_guard lock(mutex_);
        isClosed_ = true;
    }
    changed_.notify_all();
}

bool Hub::isClosed() const {
    const std::lock_guard lock(mutex_);
    return isClosed_;
}

}  // namespace collector
