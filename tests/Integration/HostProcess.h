#pragma once

#include <signal.h>
#include <sys/wait.h>

#include <cstdio>
#include <cstring>
#include <set>
#include <stdexcept>
#include <string>
#include <vector>

namespace corvane::test {

/// What became of a host application in a process of its own.
struct HostProcess {
    int status = 0;                      ///< as waitpid gives it
    std::set<std::string> acknowledged;  ///< the identifiers of events whose submission succeeded

    [[nodiscard]] bool wasKilled() const { return WIFSIGNALED(status) && WTERMSIG(status) == SIGKILL; }
    [[nodiscard]] bool succeeded() const { return status == 0; }

    /// Runs a program, which writes the identifiers to its standard output, to its end. No argument may hold a quote.
    static HostProcess run(const std::vector<std::string>& command) {
        // It ends in the midst of work, and its forked children have none of its threads: what a thread holds while it
        // starts or ends, or held on a stack that is no more, would be taken for leaked.
        std::string line = "ASAN_OPTIONS=detect_leaks=0 exec";
        for (const auto& argument : command) line += " '" + argument + "'";
        FILE* output = popen(line.c_str(), "re");
        if (!output) throw std::runtime_error("cannot start a host");
        HostProcess result;
        char text[256];
        while (fgets(text, sizeof text, output)) result.acknowledged.insert(std::string(text, strcspn(text, "\n")));
        result.status = pclose(output);
        return result;
    }
};

}  // namespace corvane::test
