#include <corvane/Platform/ForkMark.h>

#include <pthread.h>

namespace corvane {

constinit std::atomic<unsigned> ForkMark::current_ = 0;

ForkMark::ForkMark() noexcept {
    static const int registered =
        pthread_atfork(nullptr, nullptr, [] { current_.fetch_add(1, std::memory_order_relaxed); });
    static_cast<void>(registered);  // without memory for the handler there is none for the child either
    generation_ = current_.load(std::memory_order_relaxed);
}

}  // namespace corvane
