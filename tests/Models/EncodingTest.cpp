#include <corvane/Models/DataEvent.h>
#include <corvane/Models/Decoding.h>

#include <tuple>
#include <unordered_map>

#include "tests/support/Testing.h"

namespace corvane {
namespace {

using namespace std::chrono_literals;

enum class Quality : std::uint8_t { low, high };
enum class Plan { free, gold };
std::string_view toText(Plan plan) {
    return plan == Plan::gold ? "gold" : "free";
}
bool fromText(std::string_view text, Plan& plan) {
    plan = text == "gold" ? Plan::gold : Plan::free;
    return text == "gold" || text == "free";
}

struct Track {
    std::string title;
    std::optional<double> length;
};

struct Everything {
    std::string text = "t";
    std::int8_t small = -1;
    std::uint64_t large = std::numeric_limits<std::uint64_t>::max();
    std::int64_t lowest = std::numeric_limits<std::int64_t>::min();
    float ratio = 0.1f;
    double number = 3;
    bool flag = true;
    Date date = Date(1500ms);
    std::chrono::minutes pause = 2min;
    std::u8string utf8 = u8"\u00fc";
    std::optional<int> none;
    std::optional<int> some = 7;
    std::vector<Track> tracks = {{"a", 1.25}, {"b", {}}};
    std::map<std::string, std::vector<int>> lists = {{"x", {1, 2}}, {"y", {}}};
    Quality quality = Quality::high;
    Plan plan = Plan::gold;
    std::vector<bool> bits = {true, false};
};

class Hidden {
  public:
    Hidden() = default;
    explicit Hidden(std::string id) : id_(std::move(id)) {}
    static constexpr auto corvaneFields() { return std::tuple{Field{"id", &Hidden::id_}}; }
    [[nodiscard]] const std::string& id() const { return id_; }

  private:
    std::string id_;
};

struct Bare {
    void encode(Encoder& encoder) const { encoder.integer(7); }
};

TEST(Encoding, WritesEveryKindOfFieldAndReadsItBack) {
    const JSON json = toDict(Everything{});
    EXPECT_EQ(json.text(), R"({"text":"t","small":-1,"large":18446744073709551615,"lowest":-9223372036854775808,)"
                           R"("ratio":0.1,"number":3.0,"flag":true,"date":1500,"pause":120000,"utf8":"ü","some":7,)"
                           R"("tracks":[{"title":"a","length":1.25},{"title":"b"}],"lists":{"x":[1,2],"y":[]},)"
                           R"("quality":1,"plan":"gold","bits":[true,false]})");
    EXPECT_EQ(toDict(decode<Everything>(json)).text(), json.text());
    EXPECT_EQ(toDict(decode<Hidden>(toDict(Hidden("h")))).text(), R"({"id":"h"})");
}

// What only a descriptor or a value that is not kept can hold.
struct Fixed {
    char text[4] = {'f', 'u', 'l', 'l'};
    char8_t ended[8] = u8"end";
    int numbers[2] = {1, 2};
    const char* literal = "l";
    const char* nothing = nullptr;
    std::string_view view = "v";
    static constexpr auto corvaneFields() {
        return std::tuple{Field{"text", &Fixed::text},       Field{"ended", &Fixed::ended},
                          Field{"numbers", &Fixed::numbers}, Field{"literal", &Fixed::literal},
                          Field{"nothing", &Fixed::nothing}, Field{"view", &Fixed::view}};
    }
};

TEST(Encoding, WritesArraysAsFarAsTheyGoAndViewsAtOnce) {
    EXPECT_EQ(encoded(Fixed{}).text(),
              R"({"text":"full","ended":"end","numbers":[1,2],"literal":"l","nothing":null,"view":"v"})");
}

TEST(Encoding, TruncatesDatesAndDurationsTowardZero) {
    EXPECT_EQ(encoded(Date(-500us)).text(), "0");
    EXPECT_EQ(encoded(Date(-1999us)).text(), "-1");
    EXPECT_EQ(encoded(Date(1999us)).text(), "1");
    EXPECT_EQ(encoded(-1999us).text(), "-1");
    EXPECT_EQ(encoded(std::chrono::duration<double>(1.9999)).text(), "1999");
    EXPECT_THROW((void)encoded(std::chrono::hours::max()), EncodingError);
    EXPECT_THROW((void)decode<std::chrono::nanoseconds>(encoded(std::chrono::hours(24 * 365 * 300))), DecodingError);
}

TEST(Encoding, NeverWritesBrokenTextForAnEncoderMisused) {
    const std::function<void(Encoder&)> misuses[] = {
        [](Encoder&) {},
        [](Encoder& e) { e.beginObject(); },
        [](Encoder& e) { e.beginObject(), e.integer(1); },
        [](Encoder& e) { e.beginObject(), e.key("a"), e.endObject(); },
        [](Encoder& e) { e.beginObject(), e.key("a"), e.key("b"); },
        [](Encoder& e) { e.beginArray(), e.endObject(); },
        [](Encoder& e) { e.beginArray(), e.key("a"); },
        [](Encoder& e) { e.integer(1), e.integer(2); },
    };
    for (const auto& misuse : misuses) {
        Encoder encoder;
        EXPECT_THROW((misuse(encoder), std::move(encoder).take()), EncodingError);
    }
}

TEST(Decoding, NamesWhatIsMissingWrongOrOutOfRange) {
    const auto path = [](std::string_view text) {
        try {
            (void)decode<Everything>(JSON(text));
        } catch (const DecodingError& error) {
            return std::string(error.what());
        }
        return std::string();
    };
    EXPECT_EQ(path(R"({"text":1})"), "text: the value is of another kind");
    EXPECT_EQ(path(R"({"text":""})"), "small: there is no such value");
    EXPECT_EQ(path(R"({"text":"","small":128})"), "small: the value does not fit the field");
    EXPECT_EQ(path("[]"), "the value is of another kind");
}

TEST(DataEvent, IsEncodedOnceAndGivenBackByType) {
    static int encodings = 0;
    struct Counting {
        void encode(Encoder& encoder) const {
            ++encodings;
            encoder.beginObject();
            encoder.endObject();
        }
    };
    encodings = 0;
    const AnyDataEvent event{Counting{}};
    EXPECT_EQ(event.toDict().text() + event.toDict().text(), "{}{}");
    EXPECT_EQ(encodings, 1);
    EXPECT_TRUE(event.as<Counting>() && !event.as<Track>());
    EXPECT_THROW((void)AnyDataEvent{Bare{}}.toDict(), DataEventError);
}

TEST(TypeName, IsTheLastComponentOfEveryName) {
    struct Local {};
    EXPECT_EQ(typeName<Local>(), "Local");
    EXPECT_EQ((typeName<std::pair<Track, std::pair<Local, Bare>>>()), "pair<Track, pair<Local, Bare>>");
}

}  // namespace
}  // namespace corvane
