#pragma once

// Internal: how calls through the bridge refuse their arguments. Never included by a public header.

#include <corvane/Bridge/Models/BridgedError.h>
#include <corvane/Platform/JSONText.h>
#include <corvane/Platform/Log.h>

#include <memory>
#include <string_view>
#include <utility>

namespace corvane::bridge {

/// Throws `BridgeError::notUTF8` naming `what` unless `text` is UTF-8.
inline void requireUTF8(std::string_view text, const char* what) {
    if (!jsontext::isUTF8(text)) throw BridgeError(BridgeError::notUTF8, what);
}

/// The object; throws `BridgeError::missingObject` naming `what` if there is none.
template <class T>
[[nodiscard]] std::shared_ptr<T> present(std::shared_ptr<T> object, const char* what) {
    if (!object) throw BridgeError(BridgeError::missingObject, what);
    return object;
}

/// Does `call`. What it throws is logged under `name`, since many callers look at no error, and fills `error` unless
/// that is nullptr. Returns whether nothing was thrown.
template <class F>
bool attempt(const char* name, BridgedError* error, F&& call) {
    try {
        std::forward<F>(call)();
        return true;
    } catch (...) {
        const BridgedError refusal = BridgedError::of(AnyError::current());
        Log::shared().error("Refused a call, call=%{public}@, error=%{public}@", name, refusal.what());
        if (error) *error = refusal;
        return false;
    }
}

}  // namespace corvane::bridge
