#pragma once

#include <openssl/crypto.h>

#include <corvane/Platform/SharedMutex.h>

namespace corvane {

/// Held by whoever calls OpenSSL. OpenSSL takes itself down in an exit handler, while threads of the library may still
/// be at work: the exit waits for the uses that are held, and later ones throw `SigningError` unavailable. Uses may be
/// held on several threads at once; hold one for the length of a computation, never while waiting or calling out.
///
/// At its end OpenSSL frees what it keeps for the thread, its error queue among it: a thread that ends after OpenSSL's
/// exit handler could not free it any more.
class OpenSSLUse {
  public:
    OpenSSLUse() CORVANE_NO_THREAD_ANALYSIS;  // which does not see that its lock is held
    ~OpenSSLUse();
    OpenSSLUse(const OpenSSLUse&) = delete;
    OpenSSLUse& operator=(const OpenSSLUse&) = delete;

    /// Initializes OpenSSL, before anything else that may use it, without its exit handler: a child made by fork while
    /// a thread of its parent is inside OpenSSL would wait in that handler forever. A host that was first decides for
    /// itself; then its handler is registered when this returns, so that ours, registered later, run before it.
    static void initialize() {
        OPENSSL_init_crypto(OPENSSL_INIT_NO_ATEXIT | OPENSSL_INIT_LOAD_CRYPTO_STRINGS, nullptr);
    }

  private:
    ReadLock lock_;
};

}  // namespace corvane
