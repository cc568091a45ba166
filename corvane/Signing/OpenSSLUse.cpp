#include <corvane/Signing/OpenSSLUse.h>

#include <corvane/Platform/ForkMark.h>
#include <corvane/Signing/SigningError.h>

#include <openssl/crypto.h>

#include <cstdlib>

namespace corvane {

namespace {

struct ExitState {
    SharedMutex mutex;
    bool exiting CORVANE_GUARDED_BY(mutex) = false;
    const ForkMark made;

    static ExitState& shared() {
        static auto& state = *new ExitState;
        return state;
    }

    ExitState() {
        OpenSSLUse::initialize();
        instance = this;
        exiting = std::atexit([] {
                      // A thread of the parent may have held it when the child was made; there are none in the child.
                      if (instance->made.isInChild()) return;
                      const WriteLock lock(instance->mutex);
                      instance->exiting = true;
                  }) != 0;
    }

    // Not looked up through shared(): the process may exit while that is still being made.
    static inline ExitState* instance = nullptr;
};

}  // namespace

OpenSSLUse::OpenSSLUse() : lock_(ExitState::shared().mutex) {
    if (ExitState::shared().exiting) {
        throw SigningError(SigningError::unavailable, "the process is exiting");
    }
}

OpenSSLUse::~OpenSSLUse() {
    OPENSSL_thread_stop();
}

}  // namespace corvane
