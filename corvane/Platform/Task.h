#pragma once

#include <corvane/Export.h>

#include <cstddef>
#include <new>
#include <type_traits>
#include <utility>

namespace corvane {

/// A move-only `void()` callable, stored in place when it fits.
///
/// The size is chosen so that a submission with its completion fits, and so that a task is two
/// cache lines.
class Task {
  public:
    /// Callables of up to this many bytes that can be moved without throwing are stored in place.
    static constexpr std::size_t inlineSize = 112;

    Task() noexcept = default;

    template <class F>
    requires(!std::is_same_v<std::remove_cvref_t<F>, Task> && std::is_invocable_v<std::decay_t<F>&>) CORVANE_LOCAL
        Task(F&& function) {  // NOLINT(google-explicit-constructor): any callable is a task
        using Function = std::decay_t<F>;
        if constexpr (fitsInline<Function>) {
            ::new (storage_) Function(std::forward<F>(function));
            operations_ = &inlineOperations<Function>;
        } else {
            *::new (storage_) Function* = new Function(std::forward<F>(function));
            operations_ = &heapOperations<Function>;
        }
    }

    Task(Task&& other) noexcept : operations_(std::exchange(other.operations_, nullptr)), isInRun_(other.isInRun_) {
        if (operations_) operations_->relocate(other.storage_, storage_);
    }
    Task& operator=(Task&& other) noexcept {
        if (this != &other) {
            reset();
            operations_ = std::exchange(other.operations_, nullptr);
            isInRun_ = other.isInRun_;
            if (operations_) operations_->relocate(other.storage_, storage_);
        }
        return *this;
    }
    ~Task() { reset(); }

    explicit operator bool() const noexcept { return operations_ != nullptr; }

    /// Requires: the task is not empty.
    void operator()() { operations_->invoke(storage_); }

    /// Destroys the callable and what it captured.
    void reset() noexcept {
        if (auto* operations = std::exchange(operations_, nullptr)) operations->destroy(storage_);
    }

    /// Whether the task shares the end of its run: see `SerialQueue::asyncInRun`.
    [[nodiscard]] bool isInRun() const noexcept { return isInRun_; }
    void setInRun() noexcept { isInRun_ = true; }

  private:
    struct Operations {
        void (*invoke)(void*);
        void (*relocate)(void* from, void* to) noexcept;
        void (*destroy)(void*) noexcept;
    };

    template <class F>
    static constexpr bool fitsInline =
        sizeof(F) <= inlineSize && alignof(F) <= alignof(std::max_align_t) && std::is_nothrow_move_constructible_v<F>;

    template <class F>
    CORVANE_LOCAL static constexpr Operations inlineOperations = {
        [](void* storage) { (*std::launder(static_cast<F*>(storage)))(); },
        [](void* from, void* to) noexcept {
            auto* function = std::launder(static_cast<F*>(from));
            ::new (to) F(std::move(*function));
            function->~F();
        },
        [](void* storage) noexcept { std::launder(static_cast<F*>(storage))->~F(); }};

    template <class F>
    CORVANE_LOCAL static constexpr Operations heapOperations = {
        [](void* storage) { (**static_cast<F**>(storage))(); },
        [](void* from, void* to) noexcept { *static_cast<F**>(to) = *static_cast<F**>(from); },
        [](void* storage) noexcept { delete *static_cast<F**>(storage); }};

    alignas(std::max_align_t) std::byte storage_[inlineSize];
    const Operations* operations_ = nullptr;
    bool isInRun_ = false;
};

}  // namespace corvane
