#include <corvane/Agent/Host/DefaultTransferSession.h>
#include <corvane/Transfer/InProcessTransferSession.h>

#include <corvane/Agent/Host/BackgroundTransferSession.h>

#include "tests/support/Outcome.h"
#include "tests/support/TLSServer.h"
#include "tests/support/Testing.h"

#include <dlfcn.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

namespace corvane {
namespace {

using namespace std::chrono_literals;
using test::ScriptedServer;
using Reply = ScriptedServer::Reply;
using State = TransferTask::State;

// Keeps what it was told, and the state that the task was in at that moment.
class Recorder final : public TransferSessionDelegate {
  public:
    struct Completion {
        std::optional<AnyError> error;
        std::optional<TransferResponse> response;
        State state;
    };

    void taskDidSendBodyData(const TransferTask& task, std::int64_t sent, std::int64_t total,
                             std::int64_t expected) override {
        std::lock_guard lock(mutex_);
        sums_[task.identifier()] += sent;
        EXPECT_EQ(sums_[task.identifier()], total);
        EXPECT_LE(total, expected);
    }
    void taskDidComplete(const TransferTask& task, const std::optional<AnyError>& error,
                         const std::optional<TransferResponse>& response) override {
        std::lock_guard lock(mutex_);
        EXPECT_TRUE(completions_.emplace(task.identifier(), Completion{error, response, task.state()}).second);
        if (whenCompleted) whenCompleted();
        changed_.notify_all();
    }
    void allEventsDelivered() override { completedAtSignal.push_back(completed()); }

    Completion wait(const TransferTask& task) {
        std::unique_lock lock(mutex_);
        const bool came = changed_.wait_for(lock, 10s, [&] { return completions_.contains(task.identifier()); });
        EXPECT_TRUE(came) << "task " << task.identifier();
        return came ? completions_.at(task.identifier()) : Completion{};
    }
    std::size_t completed() const {
        std::lock_guard lock(mutex_);
        return completions_.size();
    }
    std::int64_t sent(const TransferTask& task) const {
        std::lock_guard lock(mutex_);
        return sums_.at(task.identifier());
    }

    std::function<void()> whenCompleted;
    std::vector<std::size_t> completedAtSignal;  // to be read behind what the queue has run

  private:
    mutable std::mutex mutex_;
    std::condition_variable changed_;
    std::map<std::int64_t, Completion> completions_;
    std::map<std::int64_t, std::int64_t> sums_;
};

class InProcessTransferSessionTest : public testing::Test {
  protected:
    InProcessTransferSessionTest() { body("the body"); }

    std::shared_ptr<TransferSession> open(TransferLimits limits = {}) { return open(limits, recorder); }
    std::shared_ptr<TransferSession> open(TransferLimits limits, const std::shared_ptr<Recorder>& delegate) {
        return std::make_shared<InProcessTransferSession>(
            TransferSessionConfiguration{.identifier = "test", .ownerKey = "test", .limits = limits}, delegate, queue);
    }
    std::shared_ptr<TransferTask> start(TransferSession& session, const std::string& url) {
        auto task = session.uploadTask({.url = url, .method = "PUT", .headers = {}}, body());
        task->resume();
        return task;
    }
    std::filesystem::path body() { return documents / "body"; }
    std::filesystem::path body(std::string_view contents) {
        test::writeFile(body(), contents);
        return body();
    }
    static std::string describe(const Recorder::Completion& completion) {
        return test::outcome(completion.error, completion.response);
    }

    test::TemporaryDocuments documents;
    ScriptedServer server;
    std::shared_ptr<SerialQueue> queue = std::make_shared<SerialQueue>("test");
    std::shared_ptr<Recorder> recorder = std::make_shared<Recorder>();
};

TEST_F(InProcessTransferSessionTest, SendsTheFileAndReportsTheAnswer) {
    const std::string large(3'000'000, 'b');
    server.script(Reply::status(201, {{"X-Twice", "a"}, {"x-twice", "b"}, {"Empty", ""}}, "dropped"));
    auto session = open();
    auto task = session->uploadTask(
        {.url = server.url("/in?x=1"), .method = "PUT", .headers = {{"Content-Type", "text/x"}, {"X-None", ""}}},
        body(large));
    EXPECT_EQ(task->state(), State::suspended);
    task->resume();
    task->resume();
    const auto completion = recorder->wait(*task);
    EXPECT_EQ(describe(completion), "201");
    EXPECT_EQ(completion.state, State::running) << "until the callback has returned";
    const std::map<std::string, std::string> headers{{"X-Twice", "a, b"}, {"Empty", ""}, {"Content-Length", "7"}};
    EXPECT_EQ(completion.response->headers, headers);
    EXPECT_EQ(recorder->sent(*task), 3'000'000);
    queue->sync([] {});
    EXPECT_EQ(task->state(), State::completed);

    const auto requests = server.requests();
    ASSERT_EQ(requests.size(), 1u);
    EXPECT_EQ(requests[0].method + requests[0].path, "PUT/in?x=1");
    EXPECT_EQ(requests[0].body, large);
}

TEST_F(InProcessTransferSessionTest, TimesOutWhenTheServerStopsReading) {
    Reply reply = Reply::never();
    reply.bodyLimit = 10;
    server.script(reply);
    auto session = open({.timeWithoutProgress = 300ms});
    body(std::string(40'000'000, 'b'));
    const auto task = start(*session, server.url());
    EXPECT_EQ(describe(recorder->wait(*task)), "timedOut");
    EXPECT_LT(recorder->sent(*task), 40'000'000);
}

TEST_F(InProcessTransferSessionTest, FailsTheTaskAndNotTheCallWhenItCannotBeSent) {
    auto session = open();
    const std::string closedPort = ScriptedServer().url(), here = server.url();
    const auto pipe = documents / "pipe";
    ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
    const TransferRequest cases[] = {
        {.url = "file://" + body().string(), .method = "PUT", .headers = {}},
        {.url = "ftp://127.0.0.1/x", .method = "PUT", .headers = {}},
        {.url = "", .method = "PUT", .headers = {}},
        {.url = server.url("/ HTTP/1.1\r\nX: y"), .method = "PUT", .headers = {}},
        {.url = here, .method = "PUT", .headers = {{"X", "a\r\nEvil: b"}}},
        {.url = here, .method = "PUT", .headers = {{"X", std::string("a\0b", 3)}}},
        {.url = here, .method = "PUT", .headers = {{"Evil: b\r\nX", "a"}}},
    };
    const auto outcome = [&](const TransferRequest& request, const std::filesystem::path& file) {
        const auto task = session->uploadTask(request, file);
        task->resume();
        return describe(recorder->wait(*task));
    };
    for (const auto& request : cases) EXPECT_EQ(outcome(request, body()), "invalidRequest") << request.url;
    const TransferRequest good{.url = here, .method = "PUT", .headers = {}};
    for (const auto& file : {documents / "missing", documents.path(), pipe}) {
        EXPECT_EQ(outcome(good, file), "bodyUnavailable") << file;
    }
    EXPECT_EQ(describe(recorder->wait(*start(*session, closedPort))), "unreachable");
    EXPECT_TRUE(server.requests().empty());
}

// A variable of the environment while it lives.
class Variable {
  public:
    Variable(const char* name, const std::string& value) : name_(name) {
        if (const char* before = std::getenv(name)) before_ = before;
        setenv(name, value.c_str(), 1);
    }
    Variable(const Variable&) = delete;
    Variable& operator=(const Variable&) = delete;
    ~Variable() { before_ ? setenv(name_, before_->c_str(), 1) : unsetenv(name_); }

  private:
    const char* name_;
    std::optional<std::string> before_;
};

TEST_F(InProcessTransferSessionTest, TellsWhetherAServerCannotBeReachedOrTheWayToItIsBlocked) {
    const std::string proxy = "http://user:secret@" + server.url("").substr(7);
    const std::string closed = "http://127.0.0.1:1";
    const auto refusal = Reply::status(407, {{"Proxy-Authenticate", "Basic realm=x"}});
    constexpr const char* plain = "http://collector.test/in";
    constexpr const char* tunnel = "https://collector.test/in";
    const struct {
        const char* name;
        std::string proxy;
        std::string url;
        Reply reply;
        const char* expected;
    } cases[] = {
        {"through a proxy", proxy, plain, Reply::status(200), "200"},
        {"no proxy there", closed, plain, {}, "unreachable"},
        {"no name of the proxy", "http://nowhere.invalid:1", plain, {}, "unreachable"},
        {"no proxy that can be used", "what://user:secret@x", plain, {}, "unreachable"},
        {"who asks?", proxy, plain, refusal, "blocked"},
        {"the proxy's trouble looks like the server's", proxy, plain, Reply::status(502), "502"},
        {"who asks for a tunnel?", proxy, tunnel, refusal, "blocked"},
        {"no tunnel", proxy, tunnel, Reply::status(502), "blocked"},
        {"a proxy that hangs up", proxy, tunnel, Reply::raw(""), "blocked"},
        {"a proxy that says nothing", proxy, tunnel, Reply::never(), "unreachable"},
        {"no TLS at the other end", proxy, tunnel, Reply::raw("HTTP/1.1 200 OK\r\n\r\nhello"), "blocked"},
    };
    auto session = open({.timeWithoutProgress = 300ms});
    for (const auto& one : cases) {
        const Variable http("http_proxy", one.proxy), https("HTTPS_PROXY", one.proxy), none("no_proxy", "elsewhere");
        if (one.expected != std::string("unreachable") || one.proxy == proxy) server.script(one.reply);
        const auto completion = recorder->wait(*start(*session, one.url));
        EXPECT_EQ(describe(completion), one.expected) << one.name;
        const std::string text = completion.error ? completion.error->what() : "";
        EXPECT_EQ(text.find("secret"), std::string::npos) << text;
    }
    EXPECT_EQ(server.requests().at(0).path, plain);
    const Variable http("http_proxy", proxy), except("no_proxy", "collector.test");
    EXPECT_EQ(describe(recorder->wait(*start(*session, "http://collector.test:1/"))), "unreachable");

    // A stall on a connection that was there already: the body has gone out, so the attempt counts.
    EXPECT_EQ(describe(recorder->wait(*start(*session, server.url()))), "200");
    server.script(Reply::never());
    EXPECT_EQ(describe(recorder->wait(*start(*session, server.url()))), "timedOut");
}

TEST_F(InProcessTransferSessionTest, TrustsTheAuthoritiesThatItIsGiven) {
    const test::TLSServer trusted, other;
    const auto authorities = documents / "authorities";
    test::writeFile(authorities, trusted.certificate());
    const auto outcome = [&](const std::filesystem::path& certificates, const test::TLSServer& of) {
        const auto told = std::make_shared<Recorder>();
        InProcessTransferSession session({.identifier = "test", .trustedCertificates = certificates}, told, queue);
        return describe(told->wait(*start(session, of.url())));
    };
    EXPECT_EQ(outcome(authorities, trusted), "200");
    EXPECT_EQ(outcome({}, trusted), "blocked") << "not on another's connection";
    EXPECT_EQ(outcome(std::filesystem::relative(authorities), trusted), "200");
    EXPECT_EQ(outcome(authorities, other), "blocked") << "in place of any others";
    EXPECT_EQ(outcome(documents / "missing", trusted), "blocked");
    EXPECT_EQ(trusted.requests(), 2);
    EXPECT_EQ(other.requests(), 0);

    const auto directory = documents / "directory";
    std::filesystem::create_directory(directory);
    test::writeFile(directory / "one.pem", trusted.certificate());
    ASSERT_EQ(std::system(("openssl rehash '" + directory.string() + "'").c_str()), 0);
    EXPECT_EQ(outcome(directory, trusted), "200");
}

TEST_F(InProcessTransferSessionTest, ABodyFileThatChangesItsSizeMeanwhileNeitherHangsNorLies) {
    constexpr std::size_t size = 40'000'000;  // more than the sockets hold, so that the transfer waits for the server
    auto session = open();
    std::size_t sent = 0;
    const auto send = [&](std::size_t newSize) {
        Reply reply = Reply::status(200).hold();
        reply.bodyLimit = 1000;
        server.script(reply);
        body(std::string(size, 'b'));
        const auto task = start(*session, server.url());
        EXPECT_TRUE(server.waitForRequests(++sent));
        std::filesystem::resize_file(documents / "body", newSize);
        server.release();
        return describe(recorder->wait(*task));
    };
    EXPECT_EQ(send(size / 100), "bodyUnavailable");
    EXPECT_EQ(send(size + 1000), "200");
    EXPECT_EQ(server.requests().back().body.size(), size);
}

TEST_F(InProcessTransferSessionTest, LimitsTransfersPerHostWithoutHoldingUpAnother) {
    constexpr int count = 12;
    ScriptedServer other;
    server.script(Reply::status(200).hold(), count);
    auto session = open();
    auto second = open({}, std::make_shared<Recorder>());  // the limit is the process's
    std::vector<std::shared_ptr<TransferTask>> tasks;
    for (int i = 0; i < count; ++i) tasks.push_back(start(i % 2 ? *session : *second, server.url()));
    EXPECT_TRUE(server.waitForRequests(4));
    EXPECT_EQ(describe(recorder->wait(*start(*session, other.url()))), "200");
    EXPECT_EQ(server.requests().size(), 4u);
    server.release();
    EXPECT_TRUE(server.waitForRequests(5));
    EXPECT_EQ(server.requests().size(), 5u) << "one for each that has ended";
    server.release(count);
    EXPECT_TRUE(server.waitForRequests(count));
}

TEST_F(InProcessTransferSessionTest, ListsTasksAndSignalsAWakeUpOnceBehindPendingCompletions) {
    server.script(Reply::status(200));
    server.script(Reply::never());
    std::promise<void> release;
    queue->async([gate = release.get_future().share()] { gate.wait(); });
    auto session = open({.transfersPerHost = 1});
    auto finished = start(*session, server.url());
    auto running = start(*session, server.url());
    auto idle = session->uploadTask({.url = server.url(), .method = "PUT", .headers = {}}, body());
    // The second transfer has the first one's place, so the first one's completion waits in the queue.
    ASSERT_TRUE(server.waitForRequests(2));
    EXPECT_EQ(finished->state(), State::running);
    std::vector<std::pair<std::int64_t, State>> listed;
    session->tasks([&](const auto& tasks) {
        for (const auto& task : tasks) listed.emplace_back(task->identifier(), task->state());
    });
    session->deliverPendingEvents();
    EXPECT_TRUE(listed.empty()) << "no callback inside the call";
    release.set_value();
    queue->sync([] {});
    EXPECT_EQ(listed, (std::vector<std::pair<std::int64_t, State>>{{2, State::running}, {3, State::suspended}}));
    EXPECT_EQ(recorder->completed(), 1u);
    EXPECT_EQ(recorder->completedAtSignal, std::vector<std::size_t>{1});
}

TEST_F(InProcessTransferSessionTest, ACancelledTaskStopsWhereverItIsAndCompletesOnce) {
    Reply slow = Reply::never();
    slow.bodyLimit = 10;
    body(std::string(40'000'000, 'b'));
    for (const auto& reply : {Reply::status(200), slow, Reply::never()}) server.script(reply);
    std::promise<void> release;
    queue->async([gate = release.get_future().share()] { gate.wait(); });
    auto session = open({.transfersPerHost = 2});
    std::vector<std::shared_ptr<TransferTask>> tasks;  // over, sending, unanswered, queued, suspended
    for (std::size_t number = 1; number <= 4; ++number) {
        tasks.push_back(start(*session, server.url()));
        ASSERT_TRUE(server.waitForRequests(std::min<std::size_t>(number, 3)));
    }
    const auto idle = session->uploadTask({.url = server.url(), .method = "PUT", .headers = {}}, body());
    tasks.push_back(idle);
    for (const auto& task : tasks) {
        task->cancel();
        task->cancel();
        EXPECT_EQ(task->state(), State::cancelling);
    }
    idle->resume();
    EXPECT_EQ(recorder->completed(), 0u) << "no callback inside the call";
    release.set_value();
    for (const auto& task : tasks) {
        const auto completion = recorder->wait(*task);
        EXPECT_EQ(describe(completion), task == tasks.front() ? "200" : "cancelled") << task->identifier();
        EXPECT_EQ(completion.state, State::cancelling);
    }
    queue->sync([] {});
    idle->cancel();
    EXPECT_EQ(idle->state(), State::completed);
    // The one that was queued may get the place of a cancelled one before it is cancelled itself.
    EXPECT_LE(server.requests().size(), 4u) << "the one that was never resumed is not sent";
}

TEST_F(InProcessTransferSessionTest, CancelsItsTransfersWhenItGoes) {
    server.script(Reply::never(), 4);
    auto session = open();
    std::vector<std::shared_ptr<TransferTask>> tasks;
    for (int i = 0; i < 6; ++i) tasks.push_back(start(*session, server.url()));
    ASSERT_TRUE(server.waitForRequests(4));
    auto later = session->uploadTask({.url = server.url(), .method = "PUT", .headers = {}}, body());
    session.reset();
    later->resume();
    // The places at the server are free again, and those that waited for them never came.
    auto others = std::make_shared<Recorder>();
    auto next = open({}, others);
    EXPECT_EQ(describe(others->wait(*start(*next, server.url()))), "200");
    EXPECT_EQ(server.requests().size(), 5u);
    queue->sync([] {});
    EXPECT_EQ(recorder->completed(), 0u);
}

TEST_F(InProcessTransferSessionTest, MayGoInItsOwnCallbackWithItsQueue) {
    auto session = makeDefaultTransferSession({.identifier = "test"}, recorder, nullptr);
    recorder->whenCompleted = [&] { session.reset(); };
    recorder->wait(*start(*session, server.url()));
}

using InProcessTransferSessionDeathTest = InProcessTransferSessionTest;

TEST_F(InProcessTransferSessionDeathTest, TheProcessExitsWithTransfersPending) {
    EXPECT_EXIT(
        {
            server.script(Reply::never());
            static auto session = open();
            start(*session, server.url());
            if (!server.waitForRequests(1)) _exit(1);
            std::filesystem::remove_all(documents.path());
            std::exit(0);  // the session, older than the transfer thread, goes after it
        },
        testing::ExitedWithCode(0), "");
}

TEST_F(InProcessTransferSessionDeathTest, AProcessWithoutDescriptorsFailsItsTransfersAndRecovers) {
#ifdef __SANITIZE_ADDRESS__
    GTEST_SKIP() << "the sanitizer needs descriptors of its own to look at a thrown object";
#endif
    EXPECT_EXIT(
        {
            auto session = open();
            std::promise<void> ready;  // the queue's thread is there, as in a host that is at work
            queue->async([&] { ready.set_value(); });
            ready.get_future().wait();
            std::vector<int> taken;
            for (int one = 0; (one = dup(STDIN_FILENO)) >= 0;) taken.push_back(one);
            const bool failed = recorder->wait(*start(*session, server.url())).error.has_value();
            for (const int one : taken) close(one);
            const auto after = describe(recorder->wait(*start(*session, server.url())));
            std::filesystem::remove_all(documents.path());
            std::exit(failed && after == "200" ? 0 : 1);
        },
        testing::ExitedWithCode(0), "");
}

#ifndef __SANITIZE_THREAD__  // which keeps the handlers to itself

std::atomic<int> registration = 0;  // 1: the next one waits, 2: it does, 3: it may go on

// A child is forked off by one thread while another one makes a thread of the library, and is inside the registration
// of its exit handler. Ends with whether the child could exit.
[[noreturn]] void forkInside(const std::function<void()>& make, const test::TemporaryDocuments& documents) {
    registration = 1;
    std::thread maker(make);
    while (registration != 2) std::this_thread::yield();
    const pid_t child = fork();
    if (child == 0) std::exit(0);
    registration = 3;
    maker.join();
    int status = 1;
    const auto deadline = std::chrono::steady_clock::now() + 10s;
    while (waitpid(child, &status, WNOHANG) == 0) {
        if (std::chrono::steady_clock::now() > deadline) kill(child, SIGKILL);
        std::this_thread::yield();
    }
    std::filesystem::remove_all(documents.path());
    std::_Exit(status == 0 ? 0 : 1);
}

TEST_F(InProcessTransferSessionDeathTest, AChildThatIsForkedOffWhileAThreadIsMadeCanExit) {
    // It ends in the midst of work, and what its threads hold then looks like a leak.
    const Variable leaks("ASAN_OPTIONS", "detect_leaks=0");
    EXPECT_EXIT(
        {
            auto session = open();
            forkInside([&] { start(*session, server.url()); }, documents);
        },
        testing::ExitedWithCode(0), "");
    EXPECT_EXIT(forkInside(
                    [&] {
                        TransferAgentOptions options;
                        options.program = "/bin/false";
                        BackgroundTransferSession({.identifier = "test"}, recorder, queue, options);
                    },
                    documents),
                testing::ExitedWithCode(0), "");
}

#endif

}  // namespace
}  // namespace corvane

#ifndef __SANITIZE_THREAD__
// Stands in for the system's own, which it calls, in this program.
extern "C" int __cxa_atexit(void (*function)(void*), void* argument, void* object) noexcept {
    using Function = int (*)(void (*)(void*), void*, void*);
    static const auto next = reinterpret_cast<Function>(dlsym(RTLD_NEXT, "__cxa_atexit"));
    const int result = next(function, argument, object);
    int armed = 1;
    if (corvane::registration.compare_exchange_strong(armed, 2)) {
        while (corvane::registration != 3) std::this_thread::yield();
    }
    return result;
}
#endif
