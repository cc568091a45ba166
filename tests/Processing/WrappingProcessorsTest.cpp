#include <corvane/Processing/FilteringEventProcessor.h>
#include <corvane/Processing/SamplingEventProcessor.h>

#include "tests/support/TrackingFixture.h"

namespace corvane::test {
namespace {

struct View {};

/// Takes what it is asked to resume, or does not, and may refuse its queue.
struct Wrapped final : RecordingProcessor {
    void registerAccessQueue(std::shared_ptr<SerialQueue> queue) override {
        if (std::exchange(refuses, false)) throw std::runtime_error("not yet");
        RecordingProcessor::registerAccessQueue(std::move(queue));
    }
    bool resumeBackgroundProcessing(const std::string& identifier, const std::function<void()>& completion) override {
        resumed = identifier;
        if (resumes) completion();
        return resumes;
    }
    std::string resumed;
    bool refuses = false, resumes = true;
};

class WrappingProcessors : public TrackingTest {
  protected:
    void add(const std::shared_ptr<EventProcessorType>& added) { sessions->processorManager()->add(added); }
    void nextSession() {
        sessions->endSync();
        sessions->start(Session::Kind::userEvents());
    }

    const std::shared_ptr<Wrapped> wrapped = std::make_shared<Wrapped>();
};

TEST_F(WrappingProcessors, HandEverythingThroughStandForWhatTheyWrapAndBelongToOneManager) {
    const auto sampling = std::make_shared<SamplingEventProcessor>(wrapped, 1);
    const auto outer =
        std::make_shared<FilteringEventProcessor>(sampling, [](const ProcessEvent& event) { return event; });
    wrapped->refuses = true;
    EXPECT_THROW(SessionManager().processorManager()->add(outer), std::runtime_error);
    add(outer);
    EXPECT_THROW(SessionManager().processorManager()->add(sampling), InvalidArgument);
    root->enterGroup("g");
    root->submit<View>();
    root->leaveGroup();
    sessions->push(SessionData{"user", Viewer{"7", {}}}, {}, true);
    int completed = 0;
    sessions->processorManager()->resumeBackgroundProcessing("id", [&] { ++completed; });
    nextSession();
    EXPECT_EQ(wrapped->history(), processor->history());
    EXPECT_EQ(wrapped->endDates(), processor->endDates());
    EXPECT_EQ(wrapped->only("View").groupName(), "g");
    EXPECT_EQ(wrapped->resumed, "id");
    EXPECT_EQ(completed, 1);
    sessions->processorManager()->remove(wrapped);
    sessions->endSync();
    EXPECT_EQ(wrapped->history().back(), "start");
    EXPECT_EQ(outer->rewrittenEvents() + outer->droppedEvents() + sampling->droppedSessions(), 0u);
}

TEST_F(WrappingProcessors, SampleSessionsByTheirIdentifiersAlone) {
    struct Case {
        const char* identifier;
        int divisor, other;
    };
    for (const auto& [identifier, divisor, other] :
         {Case{"6F9619FF-8B86-4D01-B42D-00CF4FC964FF", 7, 2}, Case{"00000000-0000-4000-8000-000000000000", 9, 10},
          Case{"C9A646D3-9C61-4CB7-BFCD-EE2522C8F633", 115, 3}}) {
        EXPECT_TRUE(SamplingEventProcessor::keeps(identifier, 1)) << identifier;
        EXPECT_TRUE(SamplingEventProcessor::keeps(identifier, divisor)) << identifier;
        EXPECT_FALSE(SamplingEventProcessor::keeps(identifier, other)) << identifier;
    }
    for (const int none : {0, -1, std::numeric_limits<int>::min()}) {
        EXPECT_THROW(SamplingEventProcessor(wrapped, none), InvalidArgument);
    }
    EXPECT_THROW(SamplingEventProcessor(nullptr, 2), InvalidArgument);

    const auto sampling = std::make_shared<SamplingEventProcessor>(wrapped, 2);
    add(sampling);
    add(sampling);  // is told of each session twice
    std::uint64_t sessionsDropped = 0, events = 0, expected = 0;
    for (int i = 0; i < 40; ++i) {
        root->submit<View>();
        const bool isKept = SamplingEventProcessor::keeps(processor->sessions().back().identifier, 2);
        sessionsDropped += !isKept;
        expected += isKept ? 2 : 0;
        events += 2;
        if (i < 39) nextSession();
    }
    EXPECT_EQ(wrapped->events().size(), expected);
    EXPECT_EQ(sampling->droppedEvents(), events - expected);
    EXPECT_EQ(sampling->droppedSessions(), sessionsDropped);
    EXPECT_EQ(wrapped->sessions().size(), 2u * processor->sessions().size()) << "dropped ones start and end too";
}

TEST_F(WrappingProcessors, LetOutOnlyWhatTheFilterHasDecided) {
    EXPECT_THROW(FilteringEventProcessor(wrapped, {}), InvalidArgument);
    CapturedLog log;
    std::function<std::optional<ProcessEvent>(const ProcessEvent&)> next;
    const auto filter = std::make_shared<FilteringEventProcessor>(wrapped, [&](const auto& e) { return next(e); });
    add(filter);
    root->push(Screen{"home"});
    struct Case {
        const char* what;
        std::function<std::optional<ProcessEvent>(const ProcessEvent&)> filter;
        std::string goesOn;
        std::uint64_t rewritten, dropped, failures;
    };
    const std::string home = R"({"screen":{"name":"home"}})";
    const std::vector<Case> cases = {
        {"as it is", [](const auto& e) { return e; }, "ScreenView " + home, 0, 0, 0},
        {"the same, made anew", [](const auto& e) { return ProcessEvent(e.name(), JSON(e.json().text()), {}); },
         "ScreenView " + home, 0, 0, 0},
        {"another name", [](const auto& e) { return ProcessEvent("Seen", e.json(), {}); }, "Seen " + home, 1, 0, 0},
        {"other data", [](const auto& e) { return ProcessEvent(e.name(), JSON("{}"), {}); }, "ScreenView {}", 1, 0, 0},
        {"nothing", [](const auto&) { return std::nullopt; }, "", 0, 1, 0},
        {"throws", [](const auto&) -> std::optional<ProcessEvent> { throw 7; }, "", 0, 1, 1},
        {"no object", [](const auto& e) { return ProcessEvent(e.name(), JSON("[1]"), {}); }, "", 0, 1, 1},
        {"text that is no JSON",
         [](const auto& e) { return ProcessEvent(e.name(), JSON::fromEncodedText("{broken"), {}); }, "", 0, 1, 1},
        {"a name that is not UTF-8", [](const auto& e) { return ProcessEvent("\xff", e.json(), {}); }, "", 0, 1, 1},
    };
    std::uint64_t rewritten = 0, dropped = 0, failures = 0;
    for (const Case& test : cases) {
        next = test.filter;
        wrapped->clear();
        EXPECT_EQ(submit<ScreenView>(root), home) << test.what << ": its submission succeeds";
        const auto events = wrapped->events();
        EXPECT_EQ(events.empty() ? "" : events[0].name() + " " + events[0].json().text(), test.goesOn) << test.what;
        EXPECT_EQ(filter->rewrittenEvents(), rewritten += test.rewritten) << test.what;
        EXPECT_EQ(filter->droppedEvents(), dropped += test.dropped) << test.what;
        EXPECT_EQ(filter->failures(), failures += test.failures) << test.what;
    }
    EXPECT_EQ(log.count("Host code failed, call=event filter, error="), 4);
}

using ProcessorManagerTest = WrappingProcessors;

TEST_F(ProcessorManagerTest, KeepsOneResumeRequestForTheProcessorThatTakesIt) {
    const auto manager = sessions->processorManager();
    int replaced = 0, taken = 0;
    manager->resumeBackgroundProcessing("first", [&] { ++replaced; });
    manager->resumeBackgroundProcessing("second", [&] { ++taken; });
    const auto declines = std::make_shared<Wrapped>(), after = std::make_shared<Wrapped>();
    declines->resumes = false;
    for (const auto& one : {declines, wrapped, after}) manager->add(one);
    EXPECT_THROW(manager->add(nullptr), InvalidArgument);
    processor->settle();
    EXPECT_EQ(declines->resumed, "second");
    EXPECT_EQ(wrapped->resumed, "second");
    EXPECT_EQ(after->resumed, "") << "what was taken is not offered again";
    EXPECT_EQ(taken, 1);
    EXPECT_EQ(replaced, 0);

    manager->resumeBackgroundProcessing("third", [&] { ++taken; });
    processor->settle();
    EXPECT_EQ(taken, 3) << "every processor is asked, also after one has taken it";
}

}  // namespace
}  // namespace corvane::test
