#include "tests/Integration/FaultFixture.h"

namespace corvane::test {
namespace {

struct Attachment {
    JSON content;
};
struct Attached {
    EventProperty<EventData> event = required;
    EventProperty<Attachment> attachment = required;
};

class Input : public ::testing::Test, protected FaultFixture {
  protected:
    static JSON objects(int levels) {
        std::string text = "{}";
        for (int i = 1; i < levels; ++i) text = R"({"a":)" + text + "}";
        return JSON::fromEncodedText(text);
    }

    /// The attachments that have arrived, in order.
    [[nodiscard]] std::vector<std::string> arrived() const {
        std::vector<std::string> contents;
        for (const auto& document : server.documents()) {
            const auto events = document["data"]["events"].array().value();
            for (const auto& event : events) contents.push_back(event["data"]["attachment"]["content"].text());
        }
        return contents;
    }
};

TEST_F(Input, LargeWideAndDeepEventsAreDeliveredAndAlsoReadBackAfterARestart) {
    std::map<std::string, std::string> wide;
    for (int i = 0; i < 200; ++i) wide.emplace("property " + std::to_string(i), "it's '\"\n\x01 " + std::to_string(i));
#if defined(__SANITIZE_THREAD__)
    constexpr std::size_t size = 1'000'000;  // watched access by access, ten times that takes minutes
#else
    constexpr std::size_t size = 10'000'000;
#endif
    std::string large;
    for (int i = 0; large.size() < size; ++i) large += "'" + std::to_string(i) + "\xe2\x82\xac\\\"";
    // The attachment is one level itself.
    const std::vector<JSON> contents{encoded(wide), objects(127), encoded(large)};
    std::vector<std::string> expected;

    for (const bool endsSession : {true, false}) {  // then the batch stays in its backup
        Application application(server.url());
        int succeeded = 0;
        application.sessions.push(SessionData{std::string("o'clock\"\0", 9), Screen{std::string("'\0\n\"", 4)}});
        for (const auto& content : contents) {
            application.sessions.tracker()->push(Attachment{content}, {DataEventTrait::unique});
            application.sessions.tracker()->submit<Attached>(
                [&](const EventSubmitResult& result) { succeeded += result.succeeded(); });
            expected.push_back(content.text());
        }
        application.drain();
        EXPECT_EQ(succeeded, 3);
        if (endsSession) application.sessions.endSync();
        application.wait();
    }
    EXPECT_EQ(Application(server.url()).wait().delivered, (DeliveryReport::Count{3, 1}));
    EXPECT_TRUE(arrived() == expected) << "not printed: they are large";
    for (const auto& document : server.documents()) {
        const JSON viewer = document["data"]["session"][std::string_view("o'clock\"\0", 9)];
        EXPECT_EQ(viewer["name"].string(), std::string("'\0\n\"", 4));
    }
}

}  // namespace
}  // namespace corvane::test
