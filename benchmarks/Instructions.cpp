// Fixed work whose instructions scripts/check-instructions counts:
//
//   corvane_instructions submit|encode|durable COUNT

#include <corvane/Testing/TemporaryDocuments.h>

#include "benchmarks/BackupOnly.h"
#include "benchmarks/Host.h"

#include <cstdio>
#include <cstdlib>
#include <string_view>

using namespace corvane;
using namespace corvane::bench;

int main(int argc, char** argv) {
    if (argc != 3) {
        std::fputs("usage: corvane_instructions submit|encode|durable COUNT\n", stderr);
        return 2;
    }
    const std::string_view path = argv[1];
    const int count = std::atoi(argv[2]);
    const test::TemporaryDocuments documents;
    Log::shared().setLevel(LogLevel::error);
    if (path == "submit") {
        Host host;
        host.tracker->suspend();
        for (int i = 0; i < count; ++i) host.tracker->submit<ScreenView>();
        std::_Exit(0);  // what was enqueued is not run
    }
    if (path == "encode") {
        Host host;
        host.onQueue([&](AccessTracker& access) {
            for (int i = 0; i < count; ++i) access.submit<ScreenView>();
        });
        std::_Exit(0);
    }
    if (path == "durable") {
        Host host(backupOnly("instructions", 50));
        host.onQueue([&](AccessTracker& access) {
            for (int i = 0; i < count; ++i) access.submit<ScreenView>();
        });
        std::_Exit(0);
    }
    return 2;
}
