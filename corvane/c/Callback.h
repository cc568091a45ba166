#pragma once

// Internal: functions of the host's, with their contexts.

#include <corvane/c/corvane.h>

#include <memory>
#include <utility>

namespace corvane::c {

class Gate;

/// A call of the host's that is under way on this thread, unless the host has stopped such calls.
class Entered {
  public:
    /// @param mayWait whether the library's calls that wait may be made inside it
    Entered(Gate& gate, bool mayWait) noexcept;
    Entered(const Entered&) = delete;
    Entered& operator=(const Entered&) = delete;
    ~Entered();

    explicit operator bool() const { return isIn_; }

    /// Whether a call is under way on this thread in which nobody may wait.
    [[nodiscard]] static bool forbidsWaiting() noexcept;
    /// Whether a call is under way on this thread behind a gate.
    [[nodiscard]] static bool isInside(const Gate& gate) noexcept;

  private:
    Gate& gate_;
    const bool mayWait_;
    const bool isIn_;
    const Entered* const outer_;
};

/// What a callback gets, and how that is destroyed: once, when the last copy of it has gone. A value.
class Context {
  public:
    /// When there is no memory, the context is destroyed, and `std::bad_alloc` thrown.
    Context(void* pointer, corvane_destroy destroy);

    [[nodiscard]] void* pointer() const;
    [[nodiscard]] Gate& gate() const;

  private:
    struct Owned;
    std::shared_ptr<const Owned> owned_;
};

/// A function of the host's that is called with its context. A value.
template <class Signature>
class Callback;

template <class R, class... A>
class Callback<R(void*, A...)> {
  public:
    using Function = R (*)(void*, A...);

    Callback(Function function, Context context, bool mayWait = false)
        : function_(function), context_(std::move(context)), mayWait_(mayWait) {}

    explicit operator bool() const { return function_; }

    /// What the function returns, or nothing when there is none, or the host has stopped its calls.
    R operator()(A... arguments) const {
        const Entered entered(context_.gate(), mayWait_);
        if (!function_ || !entered) return R();
        return function_(context_.pointer(), arguments...);
    }

  private:
    Function function_;
    Context context_;
    bool mayWait_;
};

/// Ends the calls of contexts that are destroyed by `destroy`: see `corvane_callbacks_stop`.
void stopCallbacks(corvane_destroy destroy);

}  // namespace corvane::c
