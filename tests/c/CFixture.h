#pragma once

#include <corvane/Testing/TemporaryDocuments.h>
#include <corvane/c/corvane.h>
#include "../support/Testing.h"

#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <string>
#include <utility>
#include <vector>

namespace corvane::test {

/// A call and the error that it fills.
class CTest : public ::testing::Test {
  protected:
    CTest() { corvane_transfers_use_in_process(nullptr); }

    /// What a callback of a test's does, as a context that deletes it.
    template <class... A>
    struct Block {
        std::function<void(A...)> block;
        static void run(void* context, A... arguments) { static_cast<Block*>(context)->block(arguments...); }
        static void destroy(void* context) {
            ++destroyed;
            delete static_cast<Block*>(context);
        }
    };

    /// Keeps the events that it is told of, as "name json group".
    struct Recorder {
        std::vector<std::string> lines;
        static void process(void* context, const corvane_process_event* event) {
            const std::string group = event->group ? event->group : "-";
            EXPECT_EQ(std::string(event->json).size(), event->json_length);
            static_cast<Recorder*>(context)->lines.push_back(std::string(event->name) + " " + event->json + " " +
                                                             group);
        }
    };

    corvane_sessions* recorded(Recorder& recorder) {
        const corvane_processor_callbacks callbacks{.size = sizeof callbacks, .process = &Recorder::process};
        auto* sessions = corvane_sessions_create(&error);
        auto* processor = corvane_processor_create(&callbacks, &recorder, nullptr, &error);
        EXPECT_TRUE(corvane_sessions_add_processor(sessions, processor, &error)) << error.message;
        corvane_release(processor);
        return sessions;
    }

    corvane_event* event(const char* name, std::initializer_list<const char*> data) {
        auto* made = corvane_event_create(name, &error);
        for (const char* each : data) EXPECT_TRUE(corvane_event_require(made, each, each, &error)) << error.message;
        return made;
    }

    inline static std::atomic<int> destroyed = 0;
    corvane_error error = CORVANE_ERROR_INIT;
};

}  // namespace corvane::test
