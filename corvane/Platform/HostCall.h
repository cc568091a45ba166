#pragma once

#include <corvane/Platform/Error.h>
#include <corvane/Platform/Log.h>

#include <utility>

namespace corvane {

/// Calls something that a host plugged in. What it throws stops here: it is logged with the name of what was called,
/// and the library goes on. Internal.
template <class F>
void callHost(const char* what, F&& function) noexcept {
    try {
        std::forward<F>(function)();
    } catch (...) {
        Log::shared().error("Host code failed, call=%{public}@, error=%{public}@", what, AnyError::current().what());
    }
}

}  // namespace corvane
