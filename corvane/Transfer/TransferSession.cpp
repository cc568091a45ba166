#include <corvane/Transfer/TransferSession.h>

#include <mutex>
#include <utility>

namespace corvane {

namespace {
struct Registry {
    std::mutex mutex;
    TransferSession::Factory factory;
};

Registry& registry() {
    static auto& instance = *new Registry;  // never destroyed: sessions may be opened while the process exits
    return instance;
}
}  // namespace

void TransferSession::setFactory(Factory factory) {
    std::lock_guard lock(registry().mutex);
    registry().factory.swap(factory);  // the old one, and what it holds, goes behind the lock
}

TransferSession::Factory TransferSession::factory() {
    std::lock_guard lock(registry().mutex);
    return registry().factory;
}

}  // namespace corvane
