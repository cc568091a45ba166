// corvane-transferd: uploads what the hosts of one user have submitted, also when they have gone. The library starts
// it.
//
//     corvane-transferd --directory PATH [--idle-ms N] [--retry-ms N] [--alone-ms N]
//
// Writes "ready", or what is wrong, to standard output and goes on in the background.

#include <corvane/Agent/Daemon/Agent.h>
#include <corvane/Agent/Daemon/AgentProcess.h>
#include <corvane/Platform/Error.h>

#include <malloc.h>
#include <unistd.h>

#include <charconv>
#include <exception>
#include <map>
#include <string>
#include <string_view>

namespace {

using namespace corvane;
using namespace corvane::transferd;

struct Arguments {
    std::string directory;
    Agent::Options options{.idleTime = std::chrono::seconds(10),
                           .retryDelay = std::chrono::seconds(1),
                           .patienceWithoutHost = std::chrono::hours(1)};
};

std::chrono::milliseconds milliseconds(std::string_view text) {
    std::int64_t count = -1;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), count);
    if (error != std::errc() || end != text.data() + text.size() || count < 0 || count > 1'000'000'000) {
        throw InvalidArgument("not a number of milliseconds: " + std::string(text));
    }
    return std::chrono::milliseconds(count);
}

Arguments parse(int argc, char** argv) {
    Arguments parsed;
    for (int i = 1; i + 1 < argc; i += 2) {
        const std::string_view name = argv[i];
        if (name == "--directory") {
            parsed.directory = argv[i + 1];
        } else if (name == "--idle-ms") {
            parsed.options.idleTime = milliseconds(argv[i + 1]);
        } else if (name == "--retry-ms") {
            parsed.options.retryDelay = milliseconds(argv[i + 1]);
        } else if (name == "--alone-ms") {
            parsed.options.patienceWithoutHost = milliseconds(argv[i + 1]);
        } else {
            throw InvalidArgument("unknown argument: " + std::string(name));
        }
    }
    if (argc % 2 == 0 || !parsed.directory.starts_with('/')) {
        throw InvalidArgument(
            "usage: corvane-transferd --directory /PATH [--idle-ms N] [--retry-ms N] "
            "[--alone-ms N]");
    }
    return parsed;
}

// Tells why when there is no agent of this process; one that another process has started is as good.
int run(const Arguments& arguments) {
    bool isReported = false;
    try {
        const AgentDirectory directory(arguments.directory);
        const auto lock = process::lock(directory);
        std::string problem;
        if (!lock) return process::report("ready"), 0;
        Journal journal(directory.journalPath(), problem);
        Agent agent(directory, journal, arguments.options);
        process::report(problem.empty() ? "ready" : "ready, but " + problem);
        isReported = true;
        agent.run();
        return 0;
    } catch (const std::exception& error) {
        if (!isReported) process::report(error.what());
        return 1;
    }
}

}  // namespace

int main(int argc, char** argv) {
    const process::Inherited inherited = process::leaveEverything();
    mallopt(M_ARENA_MAX, 1);  // the threads that look up names need no memory of their own
    try {
        Arguments arguments = parse(argc, argv);
        arguments.options.inherited = inherited;
        process::becomeDaemon();
        return run(arguments);
    } catch (const std::exception& error) {
        process::report(error.what());
        return 2;
    }
}
