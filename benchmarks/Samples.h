#pragma once

#include "benchmarks/Table.h"

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <ctime>
#include <thread>
#include <vector>

namespace corvane::bench {

inline std::int64_t nanoseconds() {
    return std::chrono::steady_clock::now().time_since_epoch() / std::chrono::nanoseconds(1);
}

/// The CPU time that this process, all its threads, has used, in nanoseconds.
inline double cpuNanoseconds() {
    timespec time{};
    clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &time);
    return static_cast<double>(time.tv_sec) * 1e9 + static_cast<double>(time.tv_nsec);
}

/// How long single calls took. The clock's own cost is in each of them, the library's and the yardstick's alike.
class Samples {
  public:
    explicit Samples(std::size_t expected) { values_.reserve(expected); }

    template <class Call>
    void measure(Call&& call) {
        const auto before = nanoseconds();
        call();
        values_.push_back(nanoseconds() - before);
    }

    [[nodiscard]] Figures figures() {
        std::sort(values_.begin(), values_.end());
        return {{"median ns", at(0.5)}, {"p99 ns", at(0.99)}, {"p99.9 ns", at(0.999)}};
    }

  private:
    [[nodiscard]] double at(double quantile) const {
        return static_cast<double>(values_[static_cast<std::size_t>(quantile * static_cast<double>(values_.size()))]);
    }

    std::vector<std::int64_t> values_;
};

/// Calls `call(i)` for each i below `count` as fast as it can.
template <class Call>
Figures burst(int count, Call&& call) {
    Samples samples(static_cast<std::size_t>(count));
    const auto before = nanoseconds();
    for (int i = 0; i < count; ++i) samples.measure([&] { call(i); });
    Figures figures = samples.figures();
    figures["mean ns"] = static_cast<double>(nanoseconds() - before) / count;
    return figures;
}

/// Calls `call(i)` once a millisecond.
template <class Call>
Figures paced(int count, Call&& call) {
    Samples samples(static_cast<std::size_t>(count));
    auto next = std::chrono::steady_clock::now();
    for (int i = 0; i < count; ++i) {
        std::this_thread::sleep_until(next += std::chrono::milliseconds(1));
        samples.measure([&] { call(i); });
    }
    return samples.figures();
}

}  // namespace corvane::bench
