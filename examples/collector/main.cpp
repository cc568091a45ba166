// A local collection server, for people who try the library or want to see how it copes with a bad one.

#include "../support/CommandLine.h"
#include "CollectionServer.h"
#include "Collector.h"

#include <sys/stat.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <filesystem>
#include <optional>
#include <string>
#include <thread>

namespace collector {
namespace {

constexpr auto usage =
    "usage: collector [option ...]\n"
    "\n"
    "Takes uploads on 127.0.0.1, checks them, and keeps each document as a line of DIR/documents.ndjson. Its first "
    "line\n"
    "is the URL that it listens on; then it prints a line for each document and, when it is stopped by SIGINT or\n"
    "SIGTERM, totals. A document or event that came before is counted as a duplicate.\n"
    "\n"
    "  --port N           the port (8080); 0 for a free one\n"
    "  --directory DIR    where documents are kept (collected)\n"
    "  --public-key FILE  verify signatures with the key in this PEM file, which is read with the first upload\n"
    "  --schemas DIR      say which events do not match the schemas there, which corvane::writeCatalogue wrote; they\n"
    "                     are kept all the same: a sender gives up what is refused\n"
    "  --drop-first N     close the first N connections without an answer\n"
    "  --fail-first N     answer the first N requests after those with a failure\n"
    "  --fail-status S    the status of these failures (503)\n"
    "  --delay MS         wait before each answer\n";

struct Options {
    int port;
    std::filesystem::path directory;
    std::optional<std::filesystem::path> publicKeyFile;
    std::optional<std::filesystem::path> schemas;
    Misbehaviour misbehaviour;
};

Options optionsFrom(const examples::CommandLine& line) {
    if (!line.operands().empty()) throw examples::UsageError("unexpected argument " + line.operands().front());
    constexpr std::int64_t many = 1'000'000'000;
    Options options{.port = static_cast<int>(line.number("--port", 8080, 0, 65535)),
                    .directory = line.value("--directory").value_or("collected"),
                    .publicKeyFile = std::nullopt,
                    .schemas = std::nullopt,
                    .misbehaviour = {.dropFirst = line.number("--drop-first", 0, 0, many),
                                     .failFirst = line.number("--fail-first", 0, 0, many),
                                     .failStatus = static_cast<int>(line.number("--fail-status", 503, 200, 599)),
                                     .delay = std::chrono::milliseconds(line.number("--delay", 0, 0, many))}};
    if (const auto file = line.value("--public-key")) options.publicKeyFile = *file;
    if (const auto directory = line.value("--schemas")) options.schemas = *directory;
    return options;
}

// Keeps the signals that end the program from all threads, for the main thread to wait for.
sigset_t blockStopSignals() {
    sigset_t signals;
    sigemptyset(&signals);
    sigaddset(&signals, SIGINT);
    sigaddset(&signals, SIGTERM);
    pthread_sigmask(SIG_BLOCK, &signals, nullptr);
    return signals;
}

int collect(const Options& options) {
    umask(077);  // documents say what people did
    const sigset_t signals = blockStopSignals();
    Collector collector(options.directory, options.publicKeyFile, options.schemas);
    CollectionServer server(options.misbehaviour, collector);
    const auto port = server.bind(options.port);
    if (!port) {
        std::fprintf(stderr, "collector: port %d on 127.0.0.1 cannot be had\n", options.port);
        return EXIT_FAILURE;
    }
    std::printf("http://127.0.0.1:%d/events\n", *port);
    std::fflush(stdout);
    {
        const std::jthread serving([&] { server.serve(); });
        int signal = 0;
        sigwait(&signals, &signal);
        server.stopServing();
    }
    collector.printTotals();
    if (server.failed() > 0) std::printf("requests failed on purpose: %lld\n", static_cast<long long>(server.failed()));
    if (server.dropped() > 0) std::printf("connections dropped: %lld\n", static_cast<long long>(server.dropped()));
    return EXIT_SUCCESS;
}

int run(int argc, char** argv) {
    try {
        const examples::CommandLine line(argc, argv,
                                         {"--port", "--directory", "--public-key", "--schemas", "--drop-first",
                                          "--fail-first", "--fail-status", "--delay"});
        if (line.wantsHelp()) {
            std::fputs(usage, stdout);
            return EXIT_SUCCESS;
        }
        return collect(optionsFrom(line));
    } catch (const examples::UsageError& error) {
        std::fprintf(stderr, "collector: %s\n\n%s", error.what(), usage);
        return 2;
    } catch (const std::exception& error) {
        std::fprintf(stderr, "collector: %s\n", error.what());
        return EXIT_FAILURE;
    }
}

}  // namespace
}  // namespace collector

int main(int argc, char** argv) {
    return collector::run(argc, argv);
}
