// Every figure of the library beside the bare operation that it cannot do without, measured in the same run.
//
//   corvane_bench [--benchmark_filter=REGEX] [--benchmark_out=FILE.json]

#include "benchmarks/Server.h"
#include "benchmarks/Suites.h"
#include "benchmarks/Table.h"

#include <corvane/Platform/Log.h>
#include <corvane/Testing/TemporaryDocuments.h>
#include <corvane/Transfer/InProcessTransferSession.h>

#include <cstring>
#include <string>
#include <vector>

int main(int argc, char** argv) {
    using namespace corvane::bench;
    const Server server;  // before there are threads
    const corvane::test::TemporaryDocuments documents;
    corvane::TransferSession::setFactory(corvane::InProcessTransferSession::factory());
    corvane::Log::shared().setLevel(corvane::LogLevel::error);
    std::vector<char*> arguments(argv, argv + argc);
    std::string interleave = "--benchmark_enable_random_interleaving=true";
    arguments.push_back(interleave.data());
    int count = static_cast<int>(arguments.size());
    addBridgeBenchmarks();
    addCallerBenchmarks(server.url());
    addPipelineBenchmarks();
    addDurableBenchmarks();
    addUploadBenchmarks(server.url());
    addEndToEndBenchmarks(server.url());
    addLifecycleBenchmarks();
    addMemoryBenchmarks();
    addGrowthBenchmarks();
    benchmark::Initialize(&count, arguments.data());
    if (benchmark::ReportUnrecognizedArguments(count, arguments.data())) return 2;
    Table table;
    benchmark::RunSpecifiedBenchmarks(&table);
}
