#include <corvane/Bridge/Models/BridgedDataEvent.h>
#include <corvane/Bridge/Models/BridgedDataEventType.h>
#include <corvane/Bridge/Models/HostValue.h>
#include <corvane/Models/Decoding.h>

#include "tests/support/Testing.h"

namespace corvane {
namespace {

using namespace std::chrono_literals;
using Array = HostValue::Array;
using Dictionary = HostValue::Dictionary;

struct Track final : BridgedDataEventType {
    explicit Track(Dictionary given) : dictionary(std::move(given)) {}
    std::string dataName() const override { return "Track"; }
    Dictionary toDict() const override { return dictionary; }
    const Dictionary dictionary;
};

/// Answers with a value, or refuses.
struct Convertible final : BridgedDataType {
    explicit Convertible(std::optional<HostValue> given) : value(std::move(given)) {}
    std::optional<HostValue> toJsonValueAndReturnError(BridgedError* error) const override {
        if (!value && error) *error = BridgedError("Host", 7, "refused");
        return value;
    }
    const std::optional<HostValue> value;
};

class AnswersWithItself final : public BridgedDataType, public std::enable_shared_from_this<AnswersWithItself> {
  public:
    std::optional<HostValue> toJsonValueAndReturnError(BridgedError*) const override { return shared_from_this(); }
};

class HoldsItself final : public BridgedDataEventType, public std::enable_shared_from_this<HoldsItself> {
  public:
    std::string dataName() const override { return "HoldsItself"; }
    Dictionary toDict() const override { return {{"list", Array{shared_from_this()}}}; }
};

std::shared_ptr<Track> track(Dictionary dictionary) {
    return std::make_shared<Track>(std::move(dictionary));
}

/// The JSON text of a value, or of a data event with these properties; or domain, code and message after "! ".
template <class Conversion>
std::string outcome(Conversion conversion) {
    try {
        return conversion().text();
    } catch (...) {
        const BridgedError error = BridgedError::of(AnyError::current());
        return "! " + error.domain() + " " + std::to_string(error.code()) + " " + error.what();
    }
}
std::string asValue(const HostValue& value) {
    return outcome([&] { return toJsonValue(value); });
}
std::string asDataEvent(Dictionary dictionary) {
    return outcome([&] { return toDict(BridgedDataEvent(track(std::move(dictionary)))); });
}

TEST(HostValue, BecomesJSONByItsKind) {
    const struct {
        HostValue value;
        const char* json;
    } cases[] = {
        {nullptr, "null"},
        {HostValue(), "null"},
        {static_cast<const char*>(nullptr), "null"},
        {std::shared_ptr<int>(), "null"},
        {true, "true"},
        {7, "7"},
        {std::numeric_limits<std::int64_t>::min(), "-9223372036854775808"},
        {std::numeric_limits<std::uint64_t>::max(), "18446744073709551615"},
        {3.0, "3.0"},
        {"a\"b", R"("a\"b")"},
        {Date(1500ms), "1500"},
        {Date(-500us), "0"},
        {Array{}, "[]"},
        {Dictionary{}, "{}"},
        {Array{1, "two", Array{nullptr}, Dictionary{{"k", false}}}, R"([1,"two",[null],{"k":false}])"},
        {Dictionary{{"b", 1}, {"a", 2}, {"b", 3}}, R"({"a":2,"b":3})"},
        {Array{track({{"title", "x"}}), std::make_shared<Convertible>(Date(9ms))}, R"([{"title":"x"},9])"},
        {std::make_shared<Convertible>(Array{1}), "[1]"},
    };
    for (const auto& [value, json] : cases) EXPECT_EQ(asValue(value), json);

    std::vector<HostValue::Entry> many;
    for (int i = 0; i < 100; ++i) many.push_back({"k" + std::to_string(i % 20), i});
    EXPECT_EQ(toJsonValue(Dictionary(many)).object()->size(), 20u);
    EXPECT_EQ(toJsonValue(Dictionary(many))["k3"].integer(), 83) << "the last entry of a key counts";
}

TEST(HostValue, SaysWhyItCannotBecomeJSON) {
    const auto opaque = std::make_shared<int>(1);
    const auto refusing = std::make_shared<Convertible>(std::nullopt);
    const std::string inDataEvent = "! Corvane.DataEventError 2 a value of the data event cannot become JSON";
    const std::string inArray = "! Corvane.DataEventError 3 an element of an array cannot become JSON";
    const std::string key = "! Corvane.DataEventError 4 a key of a dictionary is not a string";
    const std::string inDictionary = "! Corvane.DataEventError 5 a value of a dictionary cannot become JSON";
    const std::string tooDeep = "! Corvane.EncodingError 2 objects and arrays nest too deep";
    const std::pair<std::string, std::string> cases[] = {
        {asValue(opaque), inDataEvent},
        {asValue(Array{opaque}), inArray},
        {asValue(Dictionary{{"k", opaque}}), inDictionary},
        {asDataEvent({{"k", opaque}}), inDataEvent},
        {asDataEvent({{"k", track({})}}), inDataEvent},  // which are converted inside lists and dictionaries
        {asDataEvent({{"k", Array{track({{"k", opaque}})}}}), inDictionary},
        {asDataEvent({{1, "x"}}), key},
        {asValue(Dictionary{{"k", refusing}, {7, 1}}), key},  // keys are looked at before values
        {asValue(Array{refusing}), "! Host 7 refused"},
        {asDataEvent({{"a", Dictionary{{"b", "\xff"}}}}), "! Corvane.EncodingError 0 a.b: the text is not UTF-8"},
        {asDataEvent({{"\xff", 1}}), "! Corvane.EncodingError 0 (key): the text is not UTF-8"},
        {asDataEvent({{"a", 0.0 / 0.0}}), "! Corvane.EncodingError 1 a: the number is infinite or not a number"},
        {asValue(std::make_shared<AnswersWithItself>()), tooDeep},
    };
    for (const auto& [outcome, expected] : cases) EXPECT_EQ(outcome, expected);
    EXPECT_TRUE(asValue(Array{std::make_shared<HoldsItself>()}).starts_with("! Corvane.EncodingError 2"));
    EXPECT_FALSE(toJsonValueAndReturnError(opaque, nullptr) || toDataWithOptions(JSON("42"), {}, nullptr));
}

}  // namespace
}  // namespace corvane
