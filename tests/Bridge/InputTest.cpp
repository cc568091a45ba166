#include "tests/Bridge/BridgeFixture.h"
#include "tests/support/CapturedLog.h"

#include <atomic>
#include <functional>
#include <thread>

namespace corvane::test {
namespace {

class BridgeInput : public BridgeTest {};

CVValue nested(int depth) {
    CVValue value = 1;
    for (int i = 0; i < depth; ++i) value = CVDictionary{{"k", std::move(value)}};
    return value;
}

class Failing final : public CVDataEventType {
  public:
    std::string dataName() const override { return "Screen"; }
    CVDictionary toDict() const override { throw std::runtime_error("the script failed"); }
};

/// Throws already when it is asked for its name.
class Nameless final : public CVDataEventType {
  public:
    std::string dataName() const override { throw std::runtime_error("no name"); }
    CVDictionary toDict() const override { return {}; }
};

TEST_F(BridgeInput, DeclarationsThatCannotBeUsedFailTheirSubmissions) {
    CapturedLog log;
    const auto unknown = static_cast<CVEventPropertyRequirement>(2);
    const CVRawEventProperty screen("Screen", optional);
    const struct {
        std::string name;
        CVRawEvent::Properties properties;
        std::string error;
    } cases[] = {
        {"View", {{"\xff", screen}}, "Corvane.BridgeError 1: a property's name is not UTF-8"},
        {"View", {{"s", {"\xff", optional}}}, "Corvane.BridgeError 1: the name of a property's data is not UTF-8"},
        {"View",
         {{"s", {"S", unknown}}},
         "Corvane.BridgeError 2: the requirement of property s is not a value of its enumeration"},
        {"View", {{"s", screen}, {"t", screen}, {"s", screen}}, "Corvane.BridgeError 3: property s is declared twice"},
    };
    for (const auto& [name, properties, error] : cases) {
        const CVRawEvent event(name, properties);
        std::vector<CVEventProperty> declared;
        for (const auto& [property, data] : properties) {
            declared.emplace_back(CVDataEventClass(data.dataName()), data.requirement(), property);
        }
        EXPECT_EQ(submit(root, event), "! " + error);
        EXPECT_EQ(submit(root, eventClass(name, declared)), "! " + error);
        CVError refused;
        EXPECT_FALSE(root->timeRawEvent(event, false, &refused));
        EXPECT_EQ(describe(refused), error);
    }
    const std::string name = "Corvane.BridgeError 1: the event's name is not UTF-8";
    EXPECT_EQ(submit(root, CVRawEvent("\xff", {})), "! Corvane.EncodingError 0: metadata.name: the text is not UTF-8");
    EXPECT_EQ(submit(root, eventClass("\xff", {})), "! Corvane.EncodingError 0: metadata.name: the text is not UTF-8");
    CVError refused;
    EXPECT_FALSE(root->timeEventType(eventClass("\xff", {}), false, &refused));
    EXPECT_EQ(describe(refused), name);
    EXPECT_EQ(submit(root, CVEventClass("NoInit", nullptr)),
              "! Corvane.BridgeError 0: the instance of event class NoInit is missing");
    EXPECT_TRUE(processor->events.empty());
}

TEST_F(BridgeInput, DataThatCannotBeUsedIsRefusedAndNeverRecorded) {
    const CVRawEvent view{"View", {{"screen", {"Screen", required}}}};
    const struct {
        CVDictionary dictionary;
        std::string error;
    } cases[] = {
        {{{"a", "\xff"}}, "Corvane.EncodingError 0: a: the text is not UTF-8"},
        {{{"\xff", 1}}, "Corvane.EncodingError 0: (key): the text is not UTF-8"},
        {{{"a", 1.0 / 0.0}}, "Corvane.EncodingError 1: a: the number is infinite or not a number"},
        {{{7, "x"}}, "Corvane.DataEventError 4: a key of a dictionary is not a string"},
        {{{"a", std::make_shared<int>(1)}}, "Corvane.DataEventError 2: a value of the data event cannot become JSON"},
    };
    CapturedLog log;
    root->pushDataEvent(raw("Screen", {{"name", "old"}}));
    for (const auto& [dictionary, error] : cases) {
        CVError refused;
        EXPECT_FALSE(root->pushDataEvent(raw("Screen", dictionary), {}, &refused));
        EXPECT_EQ(describe(refused), error);
        EXPECT_TRUE(log.count(refused.what()) == 1) << error;
        EXPECT_TRUE(submit(root, view).starts_with("! " + refused.domain())) << "not with the old data";
        root->popDataEventByName("Screen");

        EXPECT_FALSE(sessions->pushSessionData({"screen", raw("Screen", dictionary)}, {}, true, &refused));
    }
    CVError refused;
    for (const int depth : {128, 1000, 100000}) {
        EXPECT_FALSE(root->pushDataEvent(raw("Screen", {{"k", nested(depth)}}), {}, &refused));
        EXPECT_EQ(refused.code(), EncodingError::tooDeep);
        EXPECT_TRUE(submit(root, view).ends_with("objects and arrays nest too deep"));
        root->popDataEventByName("Screen");
    }
    EXPECT_FALSE(sessions->pushSessionData({"deep", raw("Screen", {{"k", nested(127)}})}, {}, false, &refused));
    EXPECT_EQ(refused.code(), EncodingError::tooDeep) << "the key takes one level";
    EXPECT_FALSE(root->pushDataEvent(std::make_shared<Failing>(), {}, &refused));
    EXPECT_EQ(describe(refused), "Corvane.HostError 0: the script failed");
    EXPECT_EQ(submit(root, view), "! Corvane.HostError 0: the script failed");
    root->popDataEventByName("Screen");
    EXPECT_EQ(submit(root, view), R"({"screen":{"name":"old"}})");
    EXPECT_EQ(processor->events.size(), 1u);
    EXPECT_EQ(processor->calls, (std::vector<std::string>{"start", "process View"})) << "no session data came through";
}

TEST_F(BridgeInput, NamesAndObjectsThatCannotBeUsedChangeNothing) {
    const auto screen = raw("Screen", {});
    const struct {
        std::function<bool(CVError*)> call;
        std::string error;
    } cases[] = {
        {[&](CVError* e) { return root->pushDataEvent(nullptr, {}, e); }, "0: the data event is missing"},
        {[&](CVError* e) { return root->pushDataEvent(raw("\xff", {}), {}, e); },
         "1: the data event's name is not UTF-8"},
        {[&](CVError* e) { return root->pushDataEvent(raw("\xff", {}), {}, "script.lua", 7, e); },
         "1: the data event's name is not UTF-8"},
        {[&](CVError* e) { return root->chainWithName("\xff", e) != nullptr; }, "1: the tracker's name is not UTF-8"},
        {[&](CVError* e) { return root->enterGroupWithName("\xff", e); }, "1: the group's name is not UTF-8"},
        {[&](CVError* e) {
             return sessions->pushSessionData({"k", nullptr}, {}, false, e);
         },
         "0: the data event is missing"},
        {[&](CVError* e) {
             return sessions->pushSessionData({"\xff", screen}, {}, false, e);
         },
         "1: the key of the session data is not UTF-8"},
        {[&](CVError* e) {
             return sessions->pushSessionData({"k", raw("\xff", {})}, {}, false, e);
         },
         "1: the data event's name is not UTF-8"},
        {[&](CVError* e) { return sessions->startSessionForKind(CVSessionKind::custom, "\xff", e); },
         "1: the name of the session's kind is not UTF-8"},
        {[&](CVError* e) { return sessions->startSessionForKind(static_cast<CVSessionKind>(4), {}, e); },
         "2: the session's kind is not a value of its enumeration"},
        {[&](CVError* e) { return sessions->startSessionForKind(static_cast<CVSessionKind>(-1), {}, e); },
         "2: the session's kind is not a value of its enumeration"},
        {[&](CVError* e) { return sessions->processorManager()->addEventProcessor(nullptr, e); },
         "0: the event processor is missing"},
    };
    CapturedLog log;
    for (const auto& [call, error] : cases) {
        CVError refused;
        EXPECT_FALSE(call(&refused)) << error;
        EXPECT_EQ(describe(refused), "Corvane.BridgeError " + error);
        EXPECT_FALSE(call(nullptr));
    }
    CVError refused;
    EXPECT_FALSE(root->pushDataEvent(std::make_shared<Nameless>(), {}, &refused));
    EXPECT_EQ(describe(refused), "Corvane.HostError 0: no name");
    EXPECT_THROW(CVTracker{nullptr}, BridgeError);
    EXPECT_THROW(CVSessionManager{nullptr}, BridgeError);
    EXPECT_THROW(CVLoggingEventProcessor{static_cast<CVLoggingEventProcessorFormat>(3)}, BridgeError);
    EXPECT_THROW(CVLoggingEventProcessor{CVLoggingEventProcessorFormat::custom}, BridgeError);
    sessions->processorManager()->removeEventProcessor(nullptr);
    sessions->endSessionWithCompletion(nullptr);
    sessions->transaction(nullptr);
    root->transactionWithBlock(nullptr);
    root->whenSession(nullptr);
    root->onSessionChangeWithBlock(nullptr)->disposeOnObject(nullptr);
    processor->drain();
    EXPECT_EQ(processor->calls, (std::vector<std::string>{"start", "end"}));
}

TEST_F(BridgeInput, CallsFromManyThreadsAllArrive) {
    constexpr int threads = 4;
    constexpr int rounds = 200;
    const auto asked = std::make_shared<int>(0);
    const auto shared = eventClass("Shared", {{CVDataEventClass("N"), optional, "n"}}, asked);
    const CVRawEvent sharedRaw{"SharedRaw", {{"n", {"N", optional}}}};
    const auto data = raw("N", {{"list", CVArray{1, 2, CVDictionary{{"k", "v"}}}}});
    std::atomic<int> succeeded = 0;
    const auto count = [&](const CVProcessEvent* event, const CVError*) { succeeded += event != nullptr; };
    std::vector<std::thread> workers;
    for (int i = 0; i < threads; ++i) {
        workers.emplace_back([&] {
            for (int round = 0; round < rounds; ++round) {
                root->pushDataEvent(data, {.unique = true});
                root->submitEventType(shared, false, count);
                const auto child = root->chainWithName("child");
                child->timeEventType(shared, true);
                child->submitRawEvent(sharedRaw, false, count);
                child->popDataEventByName("N");
                child->onSessionChangeWithBlock([](const auto&, CVSessionChange) {})->disposeOnObject(child);
                root->transactionWithBlock(
                    [&](const auto& access) { access->submitRawEvent(sharedRaw, false, count); });
                sessions->pushSessionData({"n", data});
            }
        });
    }
    for (auto& worker : workers) worker.join();
    processor->drain();
    EXPECT_EQ(succeeded, 3 * threads * rounds);
    EXPECT_EQ(*asked, 1);
}

}  // namespace
}  // namespace corvane::test
