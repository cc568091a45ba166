#include "tests/support/TrackingFixture.h"

#include <random>

// Random operations on a chain of trackers, against a model of what an event must carry.

namespace corvane::test {
namespace {

struct Everything {
    EventProperty<Screen> screen = required;
    EventProperty<Viewer> viewer = EventProperty<Viewer>::optional;
    EventProperty<TimedData> span = required;
};

struct Item {
    std::string text;
    bool once;
};

/// One tracker of the model. The parent comes before it in the vector.
struct Level {
    std::map<std::string, std::vector<Item>> stacks;
    std::optional<Date> timer;
    std::vector<std::string> groups;
};

class Model {
  public:
    explicit Model(std::size_t depth) : levels(depth) {}

    void push(std::size_t at, const std::string& key, Item item, bool unique) {
        auto& stack = levels[at].stacks[key];
        if (unique) stack.clear();
        stack.push_back(std::move(item));
    }
    void pop(std::size_t at, const std::string& key) {
        if (auto& stack = levels[at].stacks[key]; !stack.empty()) stack.pop_back();
    }
    std::optional<std::string> take(std::size_t at, const std::string& key, bool consume) {
        for (std::size_t level = at + 1; level-- > 0;) {
            auto& stack = levels[level].stacks[key];
            if (stack.empty()) continue;
            const Item top = stack.back();
            if (top.once && consume) stack.pop_back();
            return top.text;
        }
        return std::nullopt;
    }
    std::string submit(std::size_t at, Date time) {
        const auto screen = take(at, "Screen", true);
        const auto viewer = take(at, "Viewer", true);
        auto& timer = levels[at].timer;
        std::string missing;
        if (!screen) missing += " screen (Screen)";
        if (!timer) missing += " span (TimedData)";
        const std::string span = timer ? toDict(TimedData(*timer, time)).text() : "";
        timer.reset();
        if (!missing.empty()) return "! required data is missing:" + missing;
        return R"({"screen":)" + *screen + (viewer ? R"(,"viewer":)" + *viewer : "") + R"(,"span":)" + span + "}";
    }
    std::string group(std::size_t at) const {
        for (std::size_t level = at + 1; level-- > 0;) {
            if (!levels[level].groups.empty()) return levels[level].groups.back();
        }
        return "-";
    }
    void leave(std::size_t at) {
        for (std::size_t level = at + 1; level-- > 0;) {
            auto& groups = levels[level].groups;
            if (groups.empty()) continue;
            calls.push_back("leave " + groups.back());
            return groups.pop_back();
        }
    }

    std::vector<Level> levels;
    std::vector<std::string> calls;  // that processors get for groups
};

class RandomOperations : public TrackingTest {
  protected:
    void step(std::mt19937& random, int number) {
        const std::size_t at = random() % trackers.size();
        Tracker& tracker = *trackers[at];
        const bool unique = random() % 5 == 0, once = random() % 4 == 0;
        const auto given = unique ? DataEventTrait::unique : DataEventTrait::onlyOnce;
        DataEventTraits traits;
        if (unique || once) traits = {once ? DataEventTrait::onlyOnce : given, given};
        const std::string name = std::to_string(number);
        const Date time = Date(1h) + std::chrono::milliseconds(number);
        switch (random() % 9) {
            case 0:
                tracker.push(Screen{name}, traits);
                model.push(at, "Screen", {R"({"name":")" + name + R"("})", once}, unique);
                break;
            case 1:
                tracker.push(Viewer{name, {}}, traits);
                model.push(at, "Viewer", {R"({"id":")" + name + R"("})", once}, unique);
                break;
            case 2:
                tracker.pop<Screen>(), model.pop(at, "Screen");
                break;
            case 3:
                tracker.pop<Viewer>(), model.pop(at, "Viewer");
                break;
            case 4:
                tracker.explicitTime<Everything>(time);
                if (!model.levels[at].timer) model.levels[at].timer = time;
                break;
            case 5:
                tracker.enterGroup(name), model.levels[at].groups.push_back(name);
                model.calls.push_back("enter " + name);
                break;
            case 6:
                tracker.leaveGroup(), model.leave(at);
                break;
            case 7: {
                const auto event = tracker.snapshot(SnapshotPolicy::now)->evaluate<ScreenView>();
                const auto screen = model.take(at, "Screen", false);
                EXPECT_EQ(event.isValid, screen.has_value());
                EXPECT_EQ(screen ? event.entries.at(0).dataEntry.data.toDict().text() : "", screen.value_or(""));
                break;
            }
            default: {
                std::string outcome, group;
                tracker.explicitSubmit<Everything>(time, [&](const EventSubmitResult& result) {
                    outcome =
                        result.succeeded() ? result.event()->json().text() : "! " + std::string(result.error()->what());
                    group = result.succeeded() ? result.event()->groupName().value_or("-") : model.group(at);
                });
                processor->settle();
                EXPECT_EQ(outcome, model.submit(at, time));
                EXPECT_EQ(group, model.group(at));
            }
        }
    }

    std::vector<std::shared_ptr<Tracker>> trackers{root, root->chain("a"), root->chain("b")};
    Model model{3};
};

TEST_F(RandomOperations, AgreeWithTheModel) {
    trackers[2] = trackers[1]->chain("b");
    const char* given = std::getenv("CORVANE_TEST_SEED");
    const unsigned seed = given ? static_cast<unsigned>(std::atol(given)) : std::random_device{}();
    std::mt19937 random(seed);
    for (int number = 0; number < 20000 && !HasFailure(); ++number) step(random, number);
    auto history = processor->history();
    std::erase_if(history, [](const auto& call) { return call.starts_with("process") || call == "start"; });
    EXPECT_TRUE(history == model.calls) << "not printed: they are many";
    if (HasFailure()) std::printf("reproduce with CORVANE_TEST_SEED=%u\n", seed);
}

}  // namespace
}  // namespace corvane::test
