#include <corvane/Platform/ForkMark.h>

#include <pthread.h>

namespace corvane {

constinit std::atomic<unsigned> ForkMark::current_ = 0;

namespace {
// At the start of the program, and not by the first mark: a child that is forked off in that moment would wait for it
// forever. Without memory for the handler there is none for a child either.
[[maybe_unused]] const int registered = pthread_atfork(nullptr, nullptr, &ForkMark::countChild);
}  // namespace

ForkMark::ForkMark() noexcept : generation_(current_.load(std::memory_order_relaxed)) {}

void ForkMark::countChild() noexcept {
    current_.fetch_add(1, std::memory_order_relaxed);
}

}  // namespace corvane
