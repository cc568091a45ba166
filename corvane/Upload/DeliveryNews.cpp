#include <corvane/Upload/DeliveryNews.h>

#include <corvane/Platform/HostCall.h>
#include <corvane/Platform/MainQueue.h>

#include <cstddef>
#include <utility>

namespace corvane {

void DeliveryNews::setObserver(DeliveryObserver observer) {
    auto shared = observer ? std::make_shared<const DeliveryObserver>(std::move(observer)) : nullptr;
    std::list<DeliveryUpdate> line;
    const Lock lock(mutex_);
    isWanted_ = shared != nullptr;
    observer_.swap(shared);  // the old one, which is the host's, goes behind the lock
    line_.swap(line);
}

// What goes out side by side is near the end of the line.
DeliveryUpdate* DeliveryNews::waitingProgress(const std::string& document) {
    int left = 64;
    for (auto one = line_.rbegin(); one != line_.rend() && left > 0; ++one, --left) {
        if (one->step == DeliveryUpdate::Step::progress && one->document == document) return &*one;
    }
    return nullptr;
}

void DeliveryNews::add(DeliveryUpdate update) {
    const Lock lock(mutex_);
    if (!observer_) return;
    const bool isProgress = update.step == DeliveryUpdate::Step::progress;
    if (auto* const waiting = isProgress ? waitingProgress(update.document) : nullptr) {
        *waiting = std::move(update);
    } else {
        line_.push_back(std::move(update));
        isDue_ = true;
    }
}

void DeliveryNews::addLoss() noexcept {
    const Lock lock(mutex_);
    isLost_ = true;
}

void DeliveryNews::post() noexcept {
    bool isDue = false;
    bool isLost = false;
    {
        const Lock lock(mutex_);
        isDue = std::exchange(isDue_, false);
        isLost = std::exchange(isLost_, false);
    }
    if (isLost) Log::shared().error("A delivery observer misses an update, there was no memory for it");
    if (!isDue) return;
    callHost("main queue", [this] {
        MainQueue::async([weak = weak_from_this()] {
            if (const auto news = weak.lock()) news->deliver();
        });
    });
}

// What is put in line meanwhile has a turn of its own: other work of the main queue is not to wait for all of it.
void DeliveryNews::deliver() {
    std::size_t count = 0;
    {
        const Lock lock(mutex_);
        count = line_.size();
    }
    for (; count > 0; --count) {
        std::shared_ptr<const DeliveryObserver> observer;
        std::list<DeliveryUpdate> next;
        {
            const Lock lock(mutex_);
            if (line_.empty()) return;
            observer = observer_;
            next.splice(next.begin(), line_, line_.begin());
        }
        callHost("delivery observer", [&] { (*observer)(next.front()); });
    }
}

}  // namespace corvane
