#include "tests/Agent/AgentFixture.h"

#include <fcntl.h>
#include <signal.h>
#include <unistd.h>

#include <sstream>

namespace corvane::test {
namespace {

using Reply = ScriptedServer::Reply;

std::string field(const std::string& text, const std::string& name) {
    const auto at = text.find("\n" + name + ":");
    if (at == std::string::npos) return {};
    const auto start = text.find_first_not_of(" \t", at + name.size() + 2);
    return text.substr(start, text.find('\n', start) - start);
}

std::set<std::string> descriptors(long process) {
    std::set<std::string> found;
    std::error_code none;
    for (const auto& entry : std::filesystem::directory_iterator("/proc/" + std::to_string(process) + "/fd", none)) {
        found.insert(std::filesystem::read_symlink(entry, none).string());
    }
    return found;
}

int children(const std::string& name) {
    int found = 0;
    std::istringstream all(readFile("/proc/self/task/" + std::to_string(getpid()) + "/children"));
    for (long child = 0; all >> child;) {
        found += readFile("/proc/" + std::to_string(child) + "/comm").starts_with(name.substr(0, 15));
    }
    return found;
}

class AgentProcessTest : public AgentFixture {
  protected:
    [[nodiscard]] std::string proc(const std::string& name) const {
        return "/proc/" + std::to_string(agent()) + "/" + name;
    }
};

TEST_F(AgentProcessTest, InheritsNothingFromItsHostAndLeavesNothingWithIt) {
    const int leaky = ::open("/proc/self/status", O_RDONLY);  // as a host opens files that knows nothing of this
    sigset_t some, before;
    sigemptyset(&some);
    sigaddset(&some, SIGUSR1);
    pthread_sigmask(SIG_BLOCK, &some, &before);
    const auto ignored = signal(SIGUSR2, SIG_IGN);
    const auto own = descriptors(getpid());
    server.script(Reply::status(200).hold());
    auto session = open(recorder);
    upload(*session, server.url(), "a");
    ASSERT_TRUE(server.waitForRequests(1));
    EXPECT_EQ(running(*session).size(), 1u);
    signal(SIGUSR2, ignored);
    pthread_sigmask(SIG_SETMASK, &before, nullptr);
    close(leaky);

    const auto status = "\n" + readFile(proc("status"));
    EXPECT_EQ(field(status, "SigBlk"), "0000000000000000");
    EXPECT_EQ(std::stoull(field(status, "SigIgn"), nullptr, 16) & (1ull << (SIGUSR2 - 1)), 0u);
    EXPECT_EQ(field(status, "Umask"), "0077");
    EXPECT_NE(field(status, "PPid"), std::to_string(getpid()));
    EXPECT_EQ(std::filesystem::read_symlink(proc("cwd")), "/");
    for (const auto& name : descriptors(agent())) {
        const bool isOwn = name == "/dev/null" || name.starts_with("socket:") || name.starts_with("anon_inode:") ||
                           name.starts_with(options.directory.string()) || name == (documents / "body a") ||
                           (name.starts_with("pipe:") && !descriptors(getpid()).contains(name));
        EXPECT_TRUE(isOwn) << name;
    }
    EXPECT_TRUE(eventually([] { return children("corvane-transferd") == 0; })) << "no zombie";
    server.release();
    ASSERT_TRUE(recorder->wait(1));
    session.reset();
    // The socket of the server's side is one more while the agent keeps its connection.
    EXPECT_TRUE(eventually([&] { return descriptors(getpid()).size() <= own.size() + 2; }));
}

TEST_F(AgentProcessTest, ItsFilesArePrivateAndItsDirectoryMayHaveAnyLength) {
    // A home may lie behind a symbolic link.
    std::filesystem::create_directories(documents / "home");
    std::filesystem::create_directory_symlink(documents / "home", documents / "link");
    std::filesystem::path deep = documents / "link";
    for (int i = 0; i < 6; ++i) deep /= std::string(60, 'x');
    options.directory = deep;
    auto session = open(recorder);
    upload(*session, server.url(), "a");
    ASSERT_TRUE(recorder->wait(1));
    EXPECT_GT(agent(), 0);
    EXPECT_EQ(log.count("agent"), 0);
    EXPECT_EQ(permissions(deep), 0700u);
    for (const auto& entry : std::filesystem::recursive_directory_iterator(deep)) {
        EXPECT_EQ(permissions(entry.path()) & 0077, 0u) << entry.path();
    }
}

TEST_F(AgentProcessTest, EndsWhenThereIsNothingToDoAndIsStartedAgain) {
    options.idleTime = 50ms;
    for (const auto* name : {"a", "b"}) {
        auto session = open(recorder);
        upload(*session, server.url(), name);
        ASSERT_TRUE(recorder->wait(name[0] == 'a' ? 1 : 2));
        ASSERT_TRUE(running(*session).empty());
        EXPECT_GT(agent(), 0) << "it stays for its host";
        session.reset();
        EXPECT_TRUE(eventually([&] { return agent() == 0; }));
    }
    EXPECT_EQ(log.count("agent"), 0);
}

TEST_F(AgentProcessTest, ThereIsOneHoweverManyStartIt) {
    std::vector<std::shared_ptr<TransferSession>> sessions;
    for (int i = 0; i < 8; ++i) sessions.push_back(open(recorder, "owner " + std::to_string(i)));
    for (const auto& session : sessions) upload(*session, server.url(), "a");
    ASSERT_TRUE(recorder->wait(8));
    EXPECT_TRUE(eventually([&] { return processes(options.directory.string() + '\0') == 1; }))
        << "those that came late are gone";
    EXPECT_EQ(log.count("agent"), 0);
}

TEST_F(AgentProcessTest, AThousandWaitingTasksCostLittleMemoryAndNoProcessorTime) {
    server.script(Reply::never(), 4);
    auto session = open(recorder);
    for (int i = 0; i < 1000; ++i) upload(*session, server.url(), std::to_string(i));
    ASSERT_TRUE(server.waitForRequests(4));
    ASSERT_EQ(running(*session).size(), 1000u);
    std::istringstream rollup(readFile(proc("smaps_rollup")));
    long kilobytes = 0;
    for (std::string name; rollup >> name;) {
        long value = 0;
        if (name.starts_with("Private_") && rollup >> value) kilobytes += value;
    }
#ifndef CORVANE_SANITIZED
    EXPECT_TRUE(kilobytes > 0 && kilobytes < 16 * 1024) << kilobytes;
#endif
    // Once what it was asked has been done, it does not come back to the system by itself.
    const auto switches = [&] { return field("\n" + readFile(proc("status")), "voluntary_ctxt_switches"); };
    const auto rests = [&, before = std::string()]() mutable {
        before = switches();
        return !eventually([&] { return switches() != before; }, 500ms);
    };
    EXPECT_TRUE(eventually(rests)) << "it keeps waking up";
}

TEST_F(AgentProcessTest, EndsWithItsDirectory) {
    auto session = open(recorder);
    upload(*session, server.url(), "a");
    ASSERT_TRUE(recorder->wait(1));
    const auto process = agent();
    session.reset();
    EXPECT_TRUE(eventually([&] {  // the agent may remove a file first
        std::error_code failed;
        std::filesystem::remove_all(options.directory, failed);
        return !std::filesystem::exists(options.directory);
    }));
    EXPECT_TRUE(eventually([&] { return ::kill(static_cast<pid_t>(process), 0) != 0; }));
}

}  // namespace
}  // namespace corvane::test
