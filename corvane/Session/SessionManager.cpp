#include <corvane/Session/SessionManager.h>

#include <corvane/Platform/HostCall.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/RecordingSwitch.h>
#include <corvane/Session/SessionCore.h>
#include <corvane/Store/DeferredStoreCore.h>

#include <optional>
#include <utility>

namespace corvane {

SessionManager::SessionManager() : core_(SessionCore::make()) {}

SessionManager::~SessionManager() {
    // The session goes on the queue, behind everything that was enqueued before; tasks that were enqueued later, and
    // handles that a host has kept, may hold the core for longer.
    const auto queue = core_->accessQueue();
    if (!core_->isInForkedChild()) core_->close();
    queue->async([core = std::move(core_)]() mutable {
        core->abandon();
        core.reset();
    });
}

const std::shared_ptr<Tracker>& SessionManager::tracker() const {
    return core_->tracker();
}
const std::shared_ptr<ProcessorManager>& SessionManager::processorManager() const {
    return core_->processorManager();
}

void SessionManager::start(Session::Kind kind) {
    core_->accessQueue()->async([core = core_, kind = std::move(kind), startDate = now()]() mutable {
        core->start(std::move(kind), startDate);
    });
}

void SessionManager::end(std::function<void()> completion) {
    core_->accessQueue()->async([core = core_, completion = std::move(completion), endDate = now()] {
        core->end(endDate);
        if (completion) callHost("end completion", completion);
    });
}

void SessionManager::endSync() {
    if (core_->isInForkedChild()) return;
    core_->accessQueue()->assertNotCurrent("SessionManager::endSync");
    if (core_->isSuspended()) return;
    const Date endDate = now();
    core_->accessQueue()->sync([&] { core_->end(endDate); });
}

void SessionManager::push(AnyDataEventEntry entry, bool submitEventQueues) {
    core_->accessQueue()->async([core = core_, entry = std::move(entry), submitEventQueues]() mutable {
        core->push(std::move(entry), submitEventQueues);
    });
}

void SessionManager::setRecording(bool isOn, std::function<void(const AnyError*)> completion) {
    if (core_->isInForkedChild()) return;
    RecordingSwitch::set(isOn);
    DeferredStoreCore::queue().async([queue = core_->accessQueue(), completion = std::move(completion)]() mutable {
        std::optional<AnyError> error;
        try {
            RecordingSwitch::save();
        } catch (...) {
            error = AnyError::current();
            Log::shared().error("Failed to keep whether to record, error=%{public}@", error->what());
        }
        if (!completion) return;
        queue->async([completion = std::move(completion), error = std::move(error)] {
            callHost("setRecording completion", [&] { completion(error ? &*error : nullptr); });
        });
    });
}

bool SessionManager::isRecording() const {
    return RecordingSwitch::isOn();
}

void SessionManager::forget(std::function<void(const ForgottenRecords&, const AnyError*)> completion) {
    core_->accessQueue()->async(
        [core = core_, completion = std::move(completion)]() mutable { core->forget(std::move(completion)); });
}

std::uint64_t SessionManager::waitingCount() const {
    return core_->accessQueue()->waitingCount();
}

void SessionManager::transaction(std::function<void(AccessSessionManager&)> block) {
    core_->accessQueue()->async([core = core_, block = std::move(block)] {
        AccessSessionManager access(core);
        if (block) callHost("session transaction", [&] { block(access); });
    });
}

}  // namespace corvane
