#include <corvane/Bridge/Session/BridgedSessionObserver.h>

#include <utility>

namespace corvane {

BridgedSessionObserver::BridgedSessionObserver(std::shared_ptr<SessionObserver> sessionObserver)
    : sessionObserver_(std::move(sessionObserver)) {}
BridgedSessionObserver::~BridgedSessionObserver() = default;

void BridgedSessionObserver::disposeOnObject(const std::shared_ptr<const void>& object) {
    sessionObserver_->disposeOn(object);
}

}  // namespace corvane
