#pragma once

#include <string>

namespace corvane::bench {

// Each registers its figures, their yardsticks and their bars.
void addBridgeBenchmarks();
void addCallerBenchmarks(const std::string& serverURL);
void addPipelineBenchmarks();
void addDurableBenchmarks();
void addUploadBenchmarks(const std::string& serverURL);
void addEndToEndBenchmarks(const std::string& serverURL);
void addLifecycleBenchmarks();
void addMemoryBenchmarks();
void addGrowthBenchmarks();

}  // namespace corvane::bench
