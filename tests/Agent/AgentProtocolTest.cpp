#include <corvane/Agent/AgentDirectory.h>
#include <corvane/Agent/AgentMessage.h>
#include <corvane/Agent/FormatError.h>
#include <corvane/Agent/FrameSocket.h>

#include "tests/Agent/AgentFixture.h"
#include "tests/support/AgentFiles.h"

#include <poll.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

namespace corvane::test {
namespace {

// A client that says what it likes.
class RawClient {
  public:
    explicit RawClient(const std::filesystem::path& directory) : socket_(AgentDirectory(directory).connect()) {}

    void sendBytes(const std::string& bytes) const {
        ::send(socket_.descriptor(), bytes.data(), bytes.size(), MSG_NOSIGNAL);
    }
    void send(agent::Request request) {
        socket_.send(agent::encode(std::move(request)));
        EXPECT_TRUE(socket_.flush());
    }
    void greet(const std::string& owner = "o") {
        send(agent::Hello{.session = "s", .owner = owner, .wakeCommand = {}});
        EXPECT_TRUE(gets<agent::Welcome>());
    }
    /// The next reply; nothing when the agent has closed the connection.
    std::optional<agent::Reply> reply() {
        for (bool isOpen = true;; isOpen = socket_.receive()) {
            if (const auto message = socket_.next()) return agent::decodeReply(*message);
            pollfd polled{socket_.descriptor(), POLLIN, 0};
            if (!isOpen || poll(&polled, 1, 10'000) <= 0) return std::nullopt;
        }
    }
    template <class Kind>
    bool gets() {
        const auto got = reply();
        return got && std::holds_alternative<Kind>(*got);
    }

  private:
    FrameSocket socket_;
};

std::string frame(const std::string& message) {
    std::string bytes;
    for (int shift = 0; shift < 32; shift += 8) bytes.push_back(static_cast<char>(message.size() >> shift));
    return bytes + message;
}

std::chrono::nanoseconds processorTime(pid_t process) {
    clockid_t clock = 0;
    timespec used{};
    EXPECT_TRUE(clock_getcpuclockid(process, &clock) == 0 && clock_gettime(clock, &used) == 0);
    return std::chrono::seconds(used.tv_sec) + std::chrono::nanoseconds(used.tv_nsec);
}

class AgentProtocolTest : public AgentFixture {
  protected:
    AgentProtocolTest() : session(open(recorder)) { EXPECT_TRUE(running(*session).empty()); }

    void expectAgentWorks() {
        const auto before = recorder->outcomes().size();
        upload(*session, server.url(), "task " + std::to_string(before));
        EXPECT_TRUE(recorder->wait(before + 1));
        EXPECT_EQ(log.count("agent"), 0) << "another client's trouble is not this one's";
    }

    std::shared_ptr<TransferSession> session;
};

TEST_F(AgentProtocolTest, ClosesTheConnectionOfWhoeverBreaksTheRulesAndNoOther) {
    const std::string message = agent::encode(agent::Hello{.session = "s", .owner = "o", .wakeCommand = {}});
    const std::string hello = frame(message);
    const std::pair<const char*, std::string> cases[] = {
        {"an empty message", frame("")},
        {"a message that is too long", std::string("\xff\xff\xff\x7f", 4)},
        {"an unknown kind", frame("\x7f")},
        {"a reply for a request", frame(agent::encode(agent::Welcome{}))},
        {"a request before the greeting", frame(agent::encode(agent::List{}))},
        {"a second greeting", hello + hello},
        {"a greeting that is cut off", frame(message.substr(0, message.size() - 2))},
        {"a session with too long a name",
         frame(agent::encode(agent::Hello{.session = std::string(9000, 's'), .owner = "o", .wakeCommand = {}}))},
        {"too long a wake command",
         frame(agent::encode(agent::Hello{.session = "s", .owner = "o", .wakeCommand = {std::string(40'000, 'w')}}))},
        {"a name that leaves the directory", hello + frame(agent::encode(agent::Submit{"../agent.lock"}))},
    };
    for (const auto& [name, bytes] : cases) {
        RawClient client(options.directory);
        client.sendBytes(bytes);
        while (const auto reply = client.reply()) {
            EXPECT_TRUE(std::holds_alternative<agent::Welcome>(*reply)) << name;
        }
    }
    RawClient other(options.directory);
    other.send(agent::Hello{.version = 99, .session = "s", .owner = "o", .wakeCommand = {}});
    EXPECT_TRUE(other.gets<agent::Welcome>()) << "it is told the version";
    EXPECT_FALSE(other.reply());
    // What a later library has to say beyond what this agent knows.
    RawClient later(options.directory);
    later.sendBytes(frame(message + "more") + frame("\x7fmore") + frame(agent::encode(agent::Ping{}) + "more"));
    EXPECT_TRUE(later.gets<agent::Welcome>());
    EXPECT_TRUE(later.gets<agent::Unsupported>());
    EXPECT_TRUE(later.gets<agent::Pong>());
    expectAgentWorks();
}

TEST_F(AgentProtocolTest, StrangersLockNobodyOutAndHostsAreNotCounted) {
    std::vector<std::unique_ptr<RawClient>> hosts, strangers;
    for (int i = 0; i < 100; ++i) {
        hosts.push_back(std::make_unique<RawClient>(options.directory));
        hosts.back()->greet(std::to_string(i % 3));
    }
    for (int i = 0; i < 100; ++i) strangers.push_back(std::make_unique<RawClient>(options.directory));
    expectAgentWorks();
    for (const auto& host : hosts) {
        host->send(agent::Ping{});
        EXPECT_TRUE(host->gets<agent::Pong>());
    }
    EXPECT_FALSE(strangers.front()->reply()) << "it makes room";
    EXPECT_FALSE(strangers.back()->reply()) << "its time is over";
}

TEST_F(AgentProtocolTest, WaitsForDescriptorsWhenThereAreNone) {
    rlimit before{};
    const auto process = static_cast<pid_t>(agent());
    ASSERT_EQ(prlimit(process, RLIMIT_NOFILE, nullptr, &before), 0);
    EXPECT_EQ(before.rlim_cur, before.rlim_max) << "it takes what it can have";
    rlimit few{0, before.rlim_max};  // as many as it has
    while (access(("/proc/" + std::to_string(process) + "/fd/" + std::to_string(few.rlim_cur)).c_str(), F_OK) == 0) {
        ++few.rlim_cur;
    }
    ASSERT_EQ(prlimit(process, RLIMIT_NOFILE, &few, nullptr), 0);
    RawClient client(options.directory);
    client.send(agent::Hello{.session = "s", .owner = "o", .wakeCommand = {}});
    EXPECT_FALSE(eventually([&] { return processorTime(process) > 200ms; }, 500ms)) << "it does not spin";
    ASSERT_EQ(prlimit(process, RLIMIT_NOFILE, &before, nullptr), 0);
    EXPECT_TRUE(client.gets<agent::Welcome>());
    expectAgentWorks();
}

TEST_F(AgentProtocolTest, RefusesSubmissionsThatAreNone) {
    const auto token = TransferSubmission::newToken();
    const std::string good = submission(token, "o").encoded();
    const std::pair<const char*, std::string> cases[] = {
        {"cut off", good.substr(0, 90)},
        {"damaged", std::string(good).replace(good.find("body"), 4, "ydob")},
        {"too long", good + std::string(TransferSubmission::longest, 'x')},
        {"another task's", submission(TransferSubmission::newToken(), "o").encoded()},
        {"another owner's", submission(token, "p").encoded()},
    };
    RawClient client(options.directory);
    client.greet();
    client.send(agent::Submit{token});
    EXPECT_TRUE(client.gets<agent::Refused>()) << "there is none";
    for (const auto& [name, bytes] : cases) {
        writeFile(documents / "submission", bytes);
        std::filesystem::rename(documents / "submission", options.directory / "spool" / token);
        client.send(agent::Submit{token});
        EXPECT_TRUE(client.gets<agent::Refused>()) << name;
    }
    EXPECT_EQ(files("spool"), 0u);
    expectAgentWorks();
}

TEST_F(AgentProtocolTest, ClosesConnectionsOfOtherUsers) {
    if (geteuid() != 0) GTEST_SKIP() << "only root can be somebody else";
    // Let somebody else reach the socket, which the modes prevent.
    for (auto path = options.directory; path != "/tmp" && path != "/"; path = path.parent_path()) {
        ASSERT_EQ(chmod(path.c_str(), 0777), 0);
    }
    ASSERT_EQ(chmod((options.directory / "agent.socket").c_str(), 0777), 0);
    const pid_t child = fork();
    if (child == 0) {
        if (chdir(options.directory.c_str()) != 0 || setgid(65534) != 0 || setuid(65534) != 0) _exit(3);
        const int socket = ::socket(AF_UNIX, SOCK_STREAM, 0);
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        std::snprintf(address.sun_path, sizeof address.sun_path, "agent.socket");
        if (connect(socket, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0) _exit(2);
        char byte = 0;
        _exit(recv(socket, &byte, 1, 0) == 0 ? 0 : 1);
    }
    int status = 0;
    waitpid(child, &status, 0);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0) << status;
    expectAgentWorks();
}

}  // namespace
}  // namespace corvane::test
