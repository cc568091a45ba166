#include <corvane/Transfer/TransferSession.h>

#include <corvane/Platform/Mutex.h>

#include <utility>

namespace corvane {

namespace {
struct Registry {
    Mutex mutex;
    TransferSession::Factory factory CORVANE_GUARDED_BY(mutex);
};

Registry& registry() {
    static auto& instance = *new Registry;  // never destroyed: sessions may be opened while the process exits
    return instance;
}
}  // namespace

void TransferSession::setFactory(Factory factory) {
    auto& all = registry();
    Lock lock(all.mutex);
    all.factory.swap(factory);  // the old one, and what it holds, goes behind the lock
}

TransferSession::Factory TransferSession::factory() {
    auto& all = registry();
    Lock lock(all.mutex);
    return all.factory;
}

}  // namespace corvane
