// A minimal host: one session, events on demand.
//
//   corvane_host DIRECTORY EVENTS
//
// Records EVENTS events, which stay waiting for a server that is not there, prints "ready" and waits to be killed.

#include "benchmarks/Host.h"

#include <unistd.h>

#include <cstdio>
#include <cstdlib>

using namespace corvane;
using namespace corvane::bench;

int main(int argc, char** argv) {
    if (argc != 3) return 2;
    DocumentsDirectory::set(argv[1]);
    TransferSession::setFactory(InProcessTransferSession::factory());  // an agent's memory is its own
    Log::shared().setLevel(LogLevel::error);
    Log::shared().setSink([](LogLevel, std::string_view) {});
    Host host(std::make_shared<UploadBatchEventProcessor>(Client{"com.example.footprint", "Footprint", "1.0", 1},
                                                          Endpoint{"http://127.0.0.1:1/in", "footprint"}));
    for (int i = std::atoi(argv[2]); i > 0; --i) host.tracker->submit<ScreenView>();
    host.drain();
    std::puts("ready");
    std::fflush(stdout);
    pause();
}
