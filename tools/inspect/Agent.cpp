#include "Agent.h"

#include "StoredDatabase.h"
#include "text.h"

#include <corvane/Agent/AgentDirectory.h>
#include <corvane/Agent/OutcomeCodec.h>
#include <corvane/Platform/PrivateFile.h>

#include <sys/stat.h>
#include <sys/sysmacros.h>

#include <algorithm>
#include <fstream>
#include <sstream>
#include <system_error>

namespace inspect {

namespace {

namespace fs = std::filesystem;

// Who holds the lock, by the system's own list. To try the lock would keep an agent from starting just then.
std::optional<std::int64_t> lockHolder(const fs::path& file) {
    struct stat status {};
    if (::stat(file.c_str(), &status) != 0) return std::nullopt;
    std::ifstream locks("/proc/locks");
    for (std::string line; std::getline(locks, line);) {
        // 3: FLOCK  ADVISORY  WRITE 1234 08:01:5678 0 EOF
        std::istringstream fields(line);
        std::string number, kind, manner, access, inode;
        std::int64_t process = 0;
        if (!(fields >> number >> kind >> manner >> access >> process >> inode)) continue;  // one that waits, too
        unsigned major = 0, minor = 0;
        unsigned long long node = 0;
        if (kind != "FLOCK" || std::sscanf(inode.c_str(), "%x:%x:%llu", &major, &minor, &node) != 3) continue;
        if (node == status.st_ino && major == ::major(status.st_dev) && minor == ::minor(status.st_dev)) return process;
    }
    return std::nullopt;
}

std::string describeOutcome(const std::string& bytes) {
    try {
        const auto outcome = corvane::decodeOutcome(bytes);
        if (outcome.error) return printable(outcome.error->what());
        return outcome.response ? "status " + std::to_string(outcome.response->statusCode) : "no answer";
    } catch (const std::exception&) {
        return "an outcome that cannot be read";
    }
}

void readJournal(const fs::path& directory, Agent& agent, std::vector<std::string>& problems) {
    const auto file = directory / "journal.db";
    if (std::error_code error; !fs::exists(file, error)) return;
    try {
        StoredDatabase journal(file);
        const auto unreadable = journal.forEach(
            "SELECT token, accepted, submission, outcome IS NOT NULL, coalesce(outcome, x'') FROM tasks ORDER BY "
            "number",
            [&](corvane::StoreStepper& row) {
                AgentTask task{.token = row.text()};
                task.accepted = corvane::dateFromMilliseconds(row.integer());
                task.submission = corvane::TransferSubmission::decode(row.bytes());
                if (row.integer() != 0) task.outcome = describeOutcome(row.bytes());
                agent.tasks.push_back(std::move(task));
            });
        if (unreadable > 0)
            problems.push_back(counted(unreadable, "task") + " in " + file.string() + " cannot be read");
    } catch (const Problem& problem) {
        problems.emplace_back(problem.what());
    }
}

void readSpool(const fs::path& spool, Agent& agent, std::vector<std::string>& problems) {
    std::error_code error;
    std::vector<std::string> names;
    for (fs::directory_iterator entry(spool, error), end; !error && entry != end; entry.increment(error)) {
        const std::string name = entry->path().filename();
        if (corvane::TransferSubmission::isToken(name)) names.push_back(name);
    }
    if (error && error != std::errc::no_such_file_or_directory) {
        problems.push_back(spool.string() + " cannot be read: " + error.message());
    }
    std::sort(names.begin(), names.end());
    for (const auto& name : names) {
        try {
            AgentTask task{.token = name, .isSpooled = true};
            task.submission = corvane::TransferSubmission::decode(corvane::readWholeFile(spool / name));
            agent.tasks.push_back(std::move(task));
        } catch (const std::exception& problem) {
            if (!fs::exists(spool / name, error)) continue;  // the agent has just taken it
            problems.push_back((spool / name).string() + ": " + printable(problem.what()));
        }
    }
}

}  // namespace

std::string AgentTask::state(bool agentRuns) const {
    if (isWithdrawn) return "was taken back from the agent: its host sends it";
    if (outcome) return "answered, which its host has not been told yet: " + *outcome;
    if (!agentRuns) return "with the agent, which does not run: the next host starts it";
    return isSpooled ? "in the agent's spool" : "the agent uploads it, or waits for the server";
}

Agent Agent::read(const fs::path& directory, std::vector<std::string>& problems) {
    Agent agent;
    agent.process = lockHolder(directory / "agent.lock");
    readJournal(directory, agent, problems);
    readSpool(directory / "spool", agent, problems);
    for (auto& task : agent.tasks) {
        std::error_code error;
        task.isWithdrawn =
            corvane::TransferSubmission::isToken(task.token) && fs::exists(directory / "withdrawn" / task.token, error);
    }
    return agent;
}

}  // namespace inspect
