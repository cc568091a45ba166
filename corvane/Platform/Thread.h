#pragma once

#include <corvane/Platform/Task.h>

#include <string_view>

namespace corvane {

/// Starts a thread that nobody joins. It blocks all signals (they are the host's), carries the last
/// part of `label` as its name, and a background thread gives way to others. Throws
/// `std::system_error` when there is no thread to be had.
void startDetachedThread(std::string_view label, bool background, Task body);

/// What every thread of the library does first, for threads that are joined: see
/// startDetachedThread. Signals are the creator's part (SignalsBlocked), so that no signal arrives
/// before they are blocked.
void prepareThread(std::string_view label, bool background);

/// Blocks all signals of the calling thread while it lives; threads started meanwhile inherit that.
class SignalsBlocked {
  public:
    SignalsBlocked();
    SignalsBlocked(const SignalsBlocked&) = delete;
    SignalsBlocked& operator=(const SignalsBlocked&) = delete;
    ~SignalsBlocked();

  private:
    alignas(16) unsigned char previous_[128];
};

}  // namespace corvane
