// Values whose kind is known at run time only, as plug-ins and scripting languages hand them over.

#include <corvane/Bridge/Models/BridgedDataEvent.h>
#include <corvane/Bridge/Models/HostValue.h>

#include "fuzz/FuzzTarget.h"

#include <FuzzedDataProvider.h>

#include <bit>
#include <stdexcept>

namespace {

using namespace corvane;

/// An object of the host's that is a data event, converts itself, or fails to.
class Object final : public BridgedDataEventType, public BridgedDataType {
  public:
    Object(HostValue value, int behaviour) : value_(std::move(value)), behaviour_(behaviour) {}
    [[nodiscard]] std::string dataName() const override { return "Object"; }
    [[nodiscard]] HostValue::Dictionary toDict() const override {
        if (const auto* dictionary = value_.dictionary()) return *dictionary;
        return {{"value", value_}};
    }
    [[nodiscard]] std::optional<HostValue> toJsonValueAndReturnError(BridgedError* error) const override {
        if (behaviour_ == 0) return value_;
        if (behaviour_ == 1) throw std::runtime_error("it throws");
        if (behaviour_ == 2 && error) *error = BridgedError("Host", 7, "it fails");
        return std::nullopt;
    }

  private:
    const HostValue value_;
    const int behaviour_;
};

HostValue make(FuzzedDataProvider& in, int depth);

HostValue::Dictionary makeDictionary(FuzzedDataProvider& in, int depth) {
    std::vector<HostValue::Entry> entries;
    for (auto count = in.ConsumeIntegralInRange(0, 40); count > 0 && in.remaining_bytes() > 0; --count) {
        HostValue key(in.ConsumeRandomLengthString(8));
        if (in.ConsumeProbability<double>() > 0.99) key = make(in, depth);
        entries.push_back({std::move(key), make(in, depth)});
    }
    return HostValue::Dictionary(std::move(entries));
}

HostValue make(FuzzedDataProvider& in, int depth) {
    switch (depth > 300 ? 0 : in.ConsumeIntegralInRange(0, 9)) {
        case 1:
            return in.ConsumeBool();
        case 2:
            return in.ConsumeIntegral<std::int64_t>();
        case 3:
            return in.ConsumeIntegral<std::uint64_t>();
        case 4:
            return std::bit_cast<double>(in.ConsumeIntegral<std::uint64_t>());
        case 5:
            return in.ConsumeRandomLengthString();
        case 6:
            return Date(Date::duration(in.ConsumeIntegral<std::int64_t>()));
        case 7: {
            HostValue::Array elements;
            for (auto count = in.ConsumeIntegralInRange(0, 40); count > 0; --count) {
                elements.push_back(make(in, depth + 1));
            }
            return elements;
        }
        case 8:
            return makeDictionary(in, depth + 1);
        case 9: {
            const int behaviour = in.ConsumeIntegralInRange(0, 3);
            const auto object = std::make_shared<Object>(make(in, depth + 1), behaviour);
            if (in.ConsumeBool()) return HostValue(std::shared_ptr<BridgedDataEventType>(object));
            return HostValue(std::shared_ptr<BridgedDataType>(object));
        }
        default:
            return nullptr;
    }
}

HostValue fromJSON(const JSON& json) {
    if (const auto flag = json.bool_()) return *flag;
    if (const auto text = json.string()) return *text;
    if (const auto number = json.integer()) return *number;
    if (const auto number = json.unsignedInteger()) return *number;
    if (const auto number = json.double_()) return *number;
    if (const auto elements = json.array()) {
        HostValue::Array values;
        for (const auto& element : *elements) values.push_back(fromJSON(element));
        return values;
    }
    const auto members = json.object();
    if (!members) return nullptr;
    std::vector<HostValue::Entry> entries;
    for (const auto& [key, member] : *members) entries.push_back({key, fromJSON(member)});
    return HostValue::Dictionary(std::move(entries));
}

void checkConverted(const JSON& json) {
    const JSON read = JSON::fromEncodedText(json.text());  // which looks at the text
    CORVANE_REQUIRE(read.exists() && jsontext::isUTF8(read.text()), "what was converted is no JSON");
    CORVANE_REQUIRE(jsontext::nesting(read.text()) <= jsontext::maximumDepth, "it nests too deep");
    const JSON again = toJsonValue(fromJSON(read));
    CORVANE_REQUIRE(again.text().size() <= read.text().size(), "it does not come back");
    CORVANE_REQUIRE(toJsonValue(fromJSON(again)).text() == again.text(), "it comes back as another value");
    BridgedError error;
    const bool isWritten = toDataWithOptions(read, {.prettyPrinted = true, .sortedKeys = true}, &error).has_value();
    CORVANE_REQUIRE(isWritten == error.domain().empty(), "a refusal has no error");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    FuzzedDataProvider in(data, size);
    const HostValue value = make(in, 0);
    BridgedError error;
    const auto json = toJsonValueAndReturnError(value, &error);
    CORVANE_REQUIRE(json || (!error.domain().empty() && *error.what()), "a refusal has no error");
    if (json) checkConverted(*json);
    const HostValue::Dictionary dictionary =
        value.dictionary() ? *value.dictionary() : HostValue::Dictionary{{"value", value}};
    const bool isPlain = detail::isPlain(dictionary);
    try {
        checkConverted(BridgedDataEvent(std::make_shared<Object>(dictionary, 0)).toDict());
    } catch (const std::exception& refusal) {
        CORVANE_REQUIRE(!isPlain, std::string("what was found plain is refused: ") + refusal.what());
    }
    return 0;
}
