#include "benchmarks/Table.h"

#include <algorithm>
#include <cstdio>
#include <optional>

namespace corvane::bench {

namespace {

using FigureName = std::pair<std::string, std::string>;  // of the benchmark, and the figure

std::map<FigureName, double>& bars() {
    static std::map<FigureName, double> all;
    return all;
}

std::map<FigureName, double>& limits() {
    static std::map<FigureName, double> all;
    return all;
}

double median(std::vector<double> values) {
    const auto middle = values.begin() + static_cast<std::ptrdiff_t>(values.size() / 2);
    std::nth_element(values.begin(), middle, values.end());
    return *middle;
}

std::string verdict(const std::map<FigureName, double>& wanted, const FigureName& name, double value) {
    const auto found = wanted.find(name);
    if (found == wanted.end()) return "";
    char text[64];
    std::snprintf(text, sizeof text, "%s %.4g", value <= found->second ? "<=" : "MISSED", found->second);
    return text;
}

}  // namespace

void add(const std::string& name, std::function<Figures()> measure, int repetitions) {
    benchmark::RegisterBenchmark(name.c_str(),
                                 [measure = std::move(measure)](benchmark::State& state) {
                                     for (auto _ : state) {
                                         for (const auto& [figure, value] : measure()) state.counters[figure] = value;
                                     }
                                 })
        ->Iterations(1)
        ->Repetitions(repetitions)
        ->UseRealTime();
}

void setBar(const std::string& yardstick, const std::string& figure, double ratio) {
    bars()[{yardstick, figure}] = ratio;
}

void setLimit(const std::string& name, const std::string& figure, double limit) {
    limits()[{name, figure}] = limit;
}

bool Table::ReportContext(const Context& context) {
    PrintBasicContext(&GetErrorStream(), context);
    return true;
}

void Table::ReportRuns(const std::vector<Run>& runs) {
    for (const Run& run : runs) {
        if (run.run_type != Run::RT_Iteration) continue;
        const std::string& name = run.run_name.function_name;
        for (const auto& [figure, value] : run.counters) results_[name][figure].push_back(value);
        std::fprintf(stderr, "  %s\n", name.c_str());
    }
}

void Table::printRow(const std::string& name, const std::string& figure, double value) {
    std::printf("| %-44s | %-18s | %10.4g |", name.c_str(), figure.c_str(), value);
    const std::string limit = verdict(limits(), {name, figure}, value);
    bool hasYardstick = false;
    for (auto next = results_.lower_bound(name + "~"); next != results_.end(); ++next) {
        if (next->first.compare(0, name.size() + 1, name + "~") != 0) break;
        const auto found = next->second.find(figure);
        if (found == next->second.end()) continue;
        if (hasYardstick) std::printf("\n| %-44s | %-18s | %10s |", "", "", "");
        const double yardstick = median(found->second), ratio = value / yardstick;
        std::printf(" %-26s | %10.4g | %7.2f | %-12s |", next->first.substr(name.size() + 1).c_str(), yardstick, ratio,
                    verdict(bars(), {next->first, figure}, ratio).c_str());
        hasYardstick = true;
    }
    if (!hasYardstick) std::printf(" %-26s | %10s | %7s | %-12s |", "", "", "", limit.c_str());
    std::printf("\n");
}

void Table::Finalize() {
    std::printf("| %-44s | %-18s | %10s | %-26s | %10s | %7s | %-12s |\n", "what", "figure", "Corvane", "yardstick", "",
                "ratio", "bar");
    std::printf("|---|---|---:|---|---:|---:|---|\n");
    for (const auto& [name, samples] : results_) {
        if (name.find('~') != std::string::npos) continue;
        for (const auto& [figure, values] : samples) printRow(name, figure, median(values));
    }
}

}  // namespace corvane::bench
