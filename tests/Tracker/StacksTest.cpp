#include "tests/support/TrackingFixture.h"

namespace corvane::test {
namespace {

class Stacks : public TrackingTest {};

namespace other {
struct Screen {
    int number;
};
}  // namespace other

TEST_F(Stacks, APushOfAnotherTypeUnderTheSameNameReplacesTheStack) {
    CapturedLog log;
    root->push(Screen{"A"});
    root->push(other::Screen{7});
    EXPECT_EQ(submit<ScreenView>(root), R"({"screen":{"number":7}})");
    EXPECT_EQ(submit<ScreenView>(root->chain("child")), R"({"screen":{"number":7}})");
    ASSERT_EQ(log.lines().size(), 1u) << "said once";
    EXPECT_TRUE(
        log.lines()[0].message.ends_with("property=screen, declared=corvane::test::Screen, "
                                         "found=corvane::test::(anonymous namespace)::other::Screen"));
    root->pop<Screen>();
    EXPECT_EQ(submit<ScreenView>(root), R"({"screen":{"number":7}})") << "a pop of the other type does nothing";
    root->pop<other::Screen>();
    EXPECT_EQ(submit<ScreenView>(root), "! required data is missing: screen (Screen)");
}

// Data that pushes when it goes, as a host's handle on some resource may.
struct Parting {
    std::shared_ptr<void> farewell;
    void encode(Encoder& encoder) const {
        encoder.beginObject();
        encoder.endObject();
    }
};
struct PartingView {
    EventProperty<Parting> parting = required;
};
namespace other {
struct Parting {
    std::string left;
};
}  // namespace other

TEST_F(Stacks, DataMayPushWhileItsStackIsEmptied) {
    int farewells = 0;
    const auto parting = [&](const AccessTracker& access, auto successor) {
        return Parting{std::shared_ptr<void>(&farewells, [=](int* count) {
            ++*count;
            for (int i = 0; i < 100; ++i) access.push(successor);
        })};
    };
    root->transaction([&](AccessTracker& access) {
        for (int i = 0; i < 100; ++i) access.push(parting(access, Parting{}));
        access.push(Parting{}, {DataEventTrait::unique});
        access.push(parting(access, Parting{}));
        access.push(other::Parting{"kind"});  // the stack becomes one of another kind, and back again
        access.push(parting(access, other::Parting{"last"}));
        access.push(parting(access, other::Parting{"never"}), {DataEventTrait::onlyOnce});
        access.pop<Parting>();
    });
    EXPECT_EQ(submit<PartingView>(root), R"({"parting":{"left":"never"}})");
    sessions->transaction([&](AccessSessionManager& access) {
        const auto keep = std::make_shared<AccessSessionManager>(access);
        const auto farewell = [keep, &farewells](int*) {
            ++farewells;
            for (int i = 0; i < 100; ++i) keep->push(SessionData{"k", other::Parting{"late"}});
        };
        access.push(SessionData{"k", Parting{{&farewells, farewell}}}, {DataEventTrait::onlyOnce});
    });
    sessions->endSync();
    EXPECT_EQ(farewells, 104);
}

}  // namespace
}  // namespace corvane::test
