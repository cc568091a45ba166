#include "tests/Bridge/BridgeFixture.h"

namespace corvane::test {
namespace {

class BridgeInput : public BridgeTest {};

CVValue nested(int depth) {
    CVValue value = 1;
    for (int i = 0; i < depth; ++i) {
        value = i % 2 ? CVValue(CVArray{std::move(value)}) : CVValue(CVDictionary{{"k", std::move(value)}});
    }
    return value;
}

/// Throws, also when it is asked for its name if it has none.
struct Failing final : CVDataEventType {
    explicit Failing(std::string given) : name(std::move(given)) {}
    std::string dataName() const override { return name.empty() ? throw std::runtime_error("no name") : name; }
    CVDictionary toDict() const override { throw std::runtime_error("the script failed"); }
    const std::string name;
};

TEST_F(BridgeInput, DeclarationsThatCannotBeUsedFailTheirSubmissions) {
    CapturedLog log;
    const auto unknown = static_cast<CVEventPropertyRequirement>(2);
    const CVRawEventProperty screen("Screen", optional);
    const struct {
        CVRawEvent::Properties properties;
        std::string error;
    } cases[] = {
        {{{"\xff", screen}}, "1: a property's name is not UTF-8"},
        {{{"s", {"\xff", optional}}}, "1: the name of a property's data is not UTF-8"},
        {{{"s", {"S", unknown}}}, "2: the requirement of property s is not a value of its enumeration"},
        {{{"s", screen}, {"t", screen}, {"s", screen}}, "3: property s is declared twice"},
    };
    CVError refused;
    for (const auto& [properties, error] : cases) {
        const CVRawEvent event("View", properties);
        std::vector<CVEventProperty> declared;
        for (const auto& [property, data] : properties) {
            declared.emplace_back(CVDataEventClass(data.dataName()), data.requirement(), property);
        }
        EXPECT_EQ(submit(root, event), "! Corvane.BridgeError " + error);
        EXPECT_EQ(submit(root, eventClass("View", declared)), "! Corvane.BridgeError " + error);
        EXPECT_FALSE(root->timeRawEvent(event, false, &refused));
        EXPECT_EQ(describe(refused), "Corvane.BridgeError " + error);
    }
    EXPECT_EQ(submit(root, CVRawEvent("\xff", {})), "! Corvane.EncodingError 0: metadata.name: the text is not UTF-8");
    EXPECT_EQ(submit(root, eventClass("\xff", {})), "! Corvane.EncodingError 0: metadata.name: the text is not UTF-8");
    EXPECT_FALSE(root->timeEventType(eventClass("\xff", {}), false, &refused));
    EXPECT_EQ(describe(refused), "Corvane.BridgeError 1: the event's name is not UTF-8");
    EXPECT_EQ(submit(root, CVEventClass("NoInit", nullptr)),
              "! Corvane.BridgeError 0: the instance of event class NoInit is missing");
    EXPECT_TRUE(processor->events().empty());
}

TEST_F(BridgeInput, DataThatCannotBeUsedIsRefusedAndNeverRecorded) {
    const CVRawEvent view{"View", {{"screen", {"Screen", required}}}};
    const struct {
        std::shared_ptr<CVDataEventType> data;
        std::string error;
    } cases[] = {
        {raw("Screen", {{"a", "\xff"}}), "Corvane.EncodingError 0: a: the text is not UTF-8"},
        {raw("Screen", {{"k", nested(100000)}}), "Corvane.EncodingError 2: "},
        {std::make_shared<Failing>("Screen"), "Corvane.HostError 0: the script failed"},
    };
    CapturedLog log;
    CVError refused;
    root->pushDataEvent(raw("Screen", {{"name", "old"}}));
    for (const auto& [data, error] : cases) {
        EXPECT_FALSE(root->pushDataEvent(data, {}, &refused));
        EXPECT_TRUE(describe(refused).starts_with(error)) << describe(refused);
        EXPECT_GE(log.count(refused.what()), 1) << error;
        EXPECT_TRUE(submit(root, view).starts_with("! " + refused.domain())) << "not with the old data";
        root->popDataEventByName("Screen");
        EXPECT_FALSE(sessions->pushSessionData({"screen", data}, {}, true, &refused));
    }
    EXPECT_FALSE(sessions->pushSessionData({"deep", raw("Screen", {{"k", nested(127)}})}, {}, false, &refused));
    EXPECT_EQ(refused.code(), EncodingError::tooDeep) << "the key takes one level";
    EXPECT_EQ(submit(root, view), R"({"screen":{"name":"old"}})");
    EXPECT_EQ(processor->history(), (std::vector<std::string>{"start", "process View"}))
        << "no session data came through";
}

TEST_F(BridgeInput, NamesAndObjectsThatCannotBeUsedChangeNothing) {
    const auto screen = raw("Screen", {}), unnamed = raw("\xff", {});
    const auto start = [&](int kind, const char* name, CVError* error) {
        return sessions->startSessionForKind(static_cast<CVSessionKind>(kind), name, error);
    };
    const auto pushData = [&](const char* key, std::shared_ptr<CVDataEventType> data, CVError* error) {
        return sessions->pushSessionData({key, std::move(data)}, {}, false, error);
    };
    const std::string noData = "0: the data event is missing", noName = "1: the data event's name is not UTF-8",
                      noKind = "2: the session's kind is not a value of its enumeration";
    const struct {
        std::function<bool(CVError*)> call;
        std::string error;
    } cases[] = {
        {[&](CVError* e) { return root->pushDataEvent(nullptr, {}, e); }, noData},
        {[&](CVError* e) { return root->pushDataEvent(unnamed, {}, e); }, noName},
        {[&](CVError* e) { return root->pushDataEvent(unnamed, {}, "script.lua", 7, e); }, noName},
        {[&](CVError* e) { return root->chainWithName("\xff", e) != nullptr; }, "1: the tracker's name is not UTF-8"},
        {[&](CVError* e) { return root->enterGroupWithName("\xff", e); }, "1: the group's name is not UTF-8"},
        {[&](CVError* e) { return pushData("k", nullptr, e); }, noData},
        {[&](CVError* e) { return pushData("\xff", screen, e); }, "1: the key of the session data is not UTF-8"},
        {[&](CVError* e) { return pushData("k", unnamed, e); }, noName},
        {[&](CVError* e) { return start(3, "\xff", e); }, "1: the name of the session's kind is not UTF-8"},
        {[&](CVError* e) { return start(4, "", e); }, noKind},
        {[&](CVError* e) { return start(-1, "", e); }, noKind},
        {[&](CVError* e) { return sessions->processorManager()->addEventProcessor(nullptr, e); },
         "0: the event processor is missing"},
    };
    CapturedLog log;
    CVError refused;
    for (const auto& [call, error] : cases) {
        EXPECT_FALSE(call(&refused)) << error;
        EXPECT_EQ(describe(refused), "Corvane.BridgeError " + error);
        EXPECT_FALSE(call(nullptr));
    }
    EXPECT_FALSE(root->pushDataEvent(std::make_shared<Failing>(""), {}, &refused));
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
    EXPECT_EQ(processor->history(), (std::vector<std::string>{"start", "end"}));
}

}  // namespace
}  // namespace corvane::test
