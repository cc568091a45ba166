#include "CFixture.h"

#include <sys/wait.h>
#include <unistd.h>

#include <cmath>
#include <thread>

namespace corvane::test {
namespace {

TEST_F(CTest, PointersThatAreNoneAreToldApart) {
    auto* sessions = corvane_sessions_create(&error);
    auto* tracker = corvane_sessions_tracker(sessions, &error);
    auto* released = corvane_event_create("Gone", &error);
    corvane_release(released);
    corvane_release(released);
    EXPECT_FALSE(corvane_retain(released));
    int local = 0;
    const struct {
        void* pointer;
        int code;
    } cases[] = {
        {nullptr, CORVANE_NO_OBJECT},
        {released, CORVANE_RELEASED_OBJECT},
        {&local, CORVANE_RELEASED_OBJECT},
        {reinterpret_cast<void*>(1), CORVANE_RELEASED_OBJECT},
        {reinterpret_cast<void*>(~std::uintptr_t{0}), CORVANE_RELEASED_OBJECT},
        {reinterpret_cast<void*>(reinterpret_cast<std::uintptr_t>(tracker) + (1 << 20)), CORVANE_WRONG_KIND},
        {tracker, CORVANE_WRONG_KIND},
        {sessions, CORVANE_WRONG_KIND},
    };
    for (const auto& [pointer, code] : cases) {
        EXPECT_FALSE(corvane_tracker_submit(tracker, static_cast<corvane_event*>(pointer), nullptr, &error));
        EXPECT_STREQ(error.domain, "Corvane.CError");
        EXPECT_EQ(error.code, code) << pointer;
        EXPECT_FALSE(corvane_event_allow(static_cast<corvane_event*>(pointer), "a", "A", nullptr));
    }
    corvane_release(&local);
    EXPECT_TRUE(corvane_tracker_leave_group(tracker, &error));
    EXPECT_STREQ(error.message, "");

    corvane_retain(tracker);
    corvane_release(tracker);
    EXPECT_STREQ(corvane_tracker_path(tracker, 0, &error), "root");
    EXPECT_FALSE(corvane_tracker_path(tracker, 1, &error));
    corvane_release(tracker);
    corvane_release(sessions);
}

TEST_F(CTest, InputThatCannotBeUsedIsRefusedWithoutEffect) {
    Recorder recorder;
    auto* sessions = recorded(recorder);
    auto* tracker = corvane_sessions_tracker(sessions, &error);
    auto* screen = event("View", {"Screen"});
    corvane_sessions_start(sessions, CORVANE_USER_EVENTS, nullptr, &error);
    corvane_tracker_push_json(tracker, "Screen", R"({"n":1})", nullptr, &error);

    const std::string deep = std::string(200, '[') + std::string(200, ']');
    const std::string inside = R"({"a":)" + std::string(127, '[') + std::string(127, ']') + "}";
    for (const char* json : {"", "{", "[1]", "7", "\"text\"", "{\"a\":1} x", "{\"a\":\"\xff\"}", "{\"a\":1e999}",
                             "{'a':1}", deep.c_str(), static_cast<const char*>(nullptr)}) {
        EXPECT_FALSE(corvane_tracker_push_json(tracker, "Screen", json, nullptr, &error)) << (json ? json : "null");
        EXPECT_STRNE(error.message, "");
    }
    auto* value = corvane_value_from_json(inside.c_str(), &error);
    ASSERT_TRUE(value) << error.message;
    auto* outer = corvane_dictionary_create(&error);
    ASSERT_TRUE(corvane_dictionary_set_value(outer, "v", value, &error));
    EXPECT_FALSE(corvane_tracker_push(tracker, "Screen", outer, nullptr, &error)) << "129 levels";
    EXPECT_FALSE(corvane_dictionary_set_real(outer, "r", std::nan(""), &error));
    EXPECT_FALSE(corvane_dictionary_set_string(outer, "s", "\xc3", &error));
    EXPECT_FALSE(corvane_array_add_null(outer, &error));
    EXPECT_FALSE(corvane_tracker_push(tracker, CORVANE_EVENT_DATA, value, nullptr, &error));
    EXPECT_FALSE(corvane_tracker_push(tracker, "\xff", value, nullptr, &error));
    const corvane_push_options unknown{.size = sizeof unknown, .traits = 4}, unset{};
    EXPECT_FALSE(corvane_tracker_push(tracker, "Screen", value, &unknown, &error));
    EXPECT_FALSE(corvane_tracker_push(tracker, "Screen", value, &unset, &error));
    struct {
        corvane_push_options known;
        std::uint64_t later = 1;
    } newer{.known = {.size = sizeof newer}};
    EXPECT_FALSE(corvane_tracker_push(tracker, "Screen", value, &newer.known, &error));

    EXPECT_FALSE(corvane_sessions_start(sessions, 9, nullptr, &error));
    EXPECT_FALSE(corvane_sessions_resume(sessions, &error));
    EXPECT_FALSE(corvane_tracker_snapshot(tracker, 2, &error));
    EXPECT_FALSE(corvane_log_set_level(3, &error));
    EXPECT_FALSE(corvane_event_require(screen, "Screen", "Screen", &error));  // a second time
    corvane_submit_options far{.size = sizeof far, .has_time = true, .time = INT64_MAX};
    EXPECT_FALSE(corvane_tracker_submit(tracker, screen, &far, &error));
    corvane_upload_options nothing{.size = sizeof nothing, .destroy = [](void*) { ++destroyed; }};
    const int before = destroyed;
    EXPECT_FALSE(corvane_uploads_create(&nothing, &error));
    EXPECT_EQ(destroyed, before + 1);
    auto* logging = corvane_logging_create(CORVANE_LOG_JSON, nullptr, nullptr, nullptr, &error);
    EXPECT_FALSE(corvane_uploads_flush(logging, &error));
    EXPECT_FALSE(corvane_logging_create(CORVANE_LOG_CUSTOM, nullptr, nullptr, nullptr, &error));

    corvane_tracker_submit(tracker, screen, nullptr, &error);
    EXPECT_FALSE(corvane_event_allow(screen, "late", "Late", &error));
    EXPECT_EQ(error.code, CORVANE_IN_USE);
    const std::string longName(5000, 'n');
    EXPECT_FALSE(corvane_tracker_push(tracker, longName.c_str(), nullptr, nullptr, &error));
    corvane_sessions_end_and_wait(sessions, &error);
    EXPECT_EQ(recorder.lines, std::vector<std::string>{R"(View {"Screen":{"n":1}} -)"});
    for (void* object : std::initializer_list<void*>{sessions, tracker, screen, value, outer, logging}) {
        corvane_release(object);
    }
}

TEST_F(CTest, WaitsAreRefusedInsideCallbacksAndObjectsThatWereKeptAreOfNoUse) {
    auto* sessions = corvane_sessions_create(&error);
    auto* tracker = corvane_sessions_tracker(sessions, &error);
    corvane_access* kept = nullptr;
    corvane_access* lent = nullptr;
    int code = 0;
    using Inside = Block<corvane_access*>;
    corvane_tracker_transaction(tracker, &Inside::run, new Inside{[&](corvane_access* access) {
                                    corvane_error inside = CORVANE_ERROR_INIT;
                                    EXPECT_FALSE(corvane_sessions_end_and_wait(sessions, &inside));
                                    EXPECT_FALSE(corvane_tracker_snapshot(tracker, CORVANE_SNAPSHOT_NOW, &inside));
                                    code = inside.code;
                                    lent = access;
                                    kept = static_cast<corvane_access*>(corvane_retain(access));
                                }},
                                &Inside::destroy, &error);
    corvane_sessions_end_and_wait(sessions, &error);
    EXPECT_EQ(code, CORVANE_WOULD_WAIT);
    EXPECT_EQ(kept, lent);
    EXPECT_FALSE(corvane_access_pop(kept, "Screen", &error));
    EXPECT_STREQ(error.domain, "Corvane.BridgeError");  // off its queue
    corvane_release(kept);
    EXPECT_FALSE(corvane_access_pop(lent, "Screen", &error));
    EXPECT_EQ(error.code, CORVANE_RELEASED_OBJECT);
    corvane_release(tracker);
    corvane_release(sessions);
}

TEST_F(CTest, CallbacksEndForOneRuntimeAndNotForAnother) {
    static std::atomic<int> ours, theirs;
    ours = theirs = 0;
    const auto destroyOurs = [](void*) { ++ours; };
    const auto destroyTheirs = [](void*) { ++theirs; };
    const auto block = [](void*, corvane_access*) {};
    auto* sessions = corvane_sessions_create(&error);
    auto* tracker = corvane_sessions_tracker(sessions, &error);
    std::atomic<bool> isDone = false;
    std::thread busy([&] {
        while (!isDone) {
            corvane_tracker_transaction(tracker, block, nullptr, destroyOurs, nullptr);
            corvane_tracker_transaction(tracker, block, nullptr, destroyTheirs, nullptr);
        }
    });
    EXPECT_TRUE(eventually([] { return ours > 100; }));
    ASSERT_TRUE(corvane_callbacks_stop(destroyOurs, &error));
    const int last = ours, others = theirs;
    EXPECT_TRUE(eventually([&] { return theirs > others + 100; }));
    isDone = true;
    busy.join();
    corvane_sessions_end_and_wait(sessions, &error);
    EXPECT_EQ(ours, last);
    corvane_release(tracker);
    corvane_release(sessions);
}

TEST_F(CTest, ObjectsAreUsedAndReleasedOnManyThreadsAtOnce) {
    auto* sessions = corvane_sessions_create(&error);
    for (int round = 0; round < 200; ++round) {
        auto* value = corvane_dictionary_create(&error);
        std::vector<std::thread> threads;
        for (int i = 0; i < 3; ++i) {
            threads.emplace_back([&] {
                for (int n = 0; n < 20; ++n) {
                    corvane_sessions_push(sessions, "k", "Data", value, nullptr, nullptr);
                    if (n == 10) corvane_release(value);
                }
            });
        }
        corvane_log_set_sink([](void*, std::int32_t, const char*) {}, nullptr, nullptr, &error);
        for (auto& thread : threads) thread.join();
        EXPECT_FALSE(corvane_dictionary_set_null(value, "k", &error));
    }
    corvane_log_set_sink(nullptr, nullptr, nullptr, &error);
    corvane_release(sessions);
}

TEST_F(CTest, AForkedChildIsToldAndLeavesCleanly) {
    auto* sessions = corvane_sessions_create(&error);
    const pid_t child = fork();
    if (child == 0) {
        const bool isRefused = !corvane_sessions_end_and_wait(sessions, &error) && error.code == CORVANE_FORKED &&
                               !corvane_sessions_create(&error) && error.code == CORVANE_FORKED &&
                               !corvane_callbacks_stop(nullptr, &error);
        corvane_release(sessions);
        _exit(isRefused ? 0 : 1);
    }
    int status = -1;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
    EXPECT_TRUE(corvane_sessions_end_and_wait(sessions, &error)) << error.message;
    corvane_release(sessions);
}

}  // namespace
}  // namespace corvane::test
