#pragma once

#include <benchmark/benchmark.h>

#include <functional>
#include <map>
#include <ostream>
#include <string>
#include <vector>

namespace corvane::bench {

/// What a benchmark measured, by name with unit: {"mean ns", 57.0}.
using Figures = std::map<std::string, double>;

/// Registers a benchmark that measures by itself and returns its figures.
///
/// A figure of the library is named "group/what"; a yardstick that it stands beside has the same name with "~" and what
/// it is: "caller/submit, burst" and "caller/submit, burst~spdlog". Each is run `repetitions` times, in random order
/// between all of them, and its medians count.
void add(const std::string& name, std::function<Figures()> measure, int repetitions = 5);

/// The library's figure is at most `ratio` times that of the yardstick.
void setBar(const std::string& yardstick, const std::string& figure, double ratio);
/// The library's figure is at most this.
void setLimit(const std::string& name, const std::string& figure, double limit);

/// Prints one table when all benchmarks have run: figure, library, yardstick, ratio, bar.
class Table final : public benchmark::BenchmarkReporter {
  public:
    bool ReportContext(const Context& context) override;
    void ReportRuns(const std::vector<Run>& runs) override;
    void Finalize() override;

  private:
    using Samples = std::map<std::string, std::vector<double>>;

    void printRow(const std::string& name, const std::string& figure, double value);

    std::map<std::string, Samples> results_;
};

}  // namespace corvane::bench
