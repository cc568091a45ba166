// Values whose kind is known at run time only, as plug-ins and scripting languages hand them over.

#include <corvane/Bridge/Models/BridgedDataEvent.h>
#include <corvane/Bridge/Models/HostValue.h>

#include "fuzz/FuzzTarget.h"

#include <bit>
#include <stdexcept>

using namespace corvane;

namespace {

/// An object of the host's that is a data event, converts itself, or fails to.
struct Object final : BridgedDataEventType, BridgedDataType {
    Object(HostValue theValue, int theBehaviour) : value(std::move(theValue)), behaviour(theBehaviour) {}
    [[nodiscard]] std::string dataName() const override { return "Object"; }
    [[nodiscard]] HostValue::Dictionary toDict() const override { return {{"value", value}}; }
    [[nodiscard]] std::optional<HostValue> toJsonValueAndReturnError(BridgedError* error) const override {
        if (behaviour == 0) return value;
        if (behaviour == 1) throw std::runtime_error("it throws");
        if (error && behaviour == 2) *error = BridgedError("Host", 7, "it fails");
        return std::nullopt;
    }
    const HostValue value;
    const int behaviour;
};

HostValue make(FuzzedDataProvider& in, int depth) {
    const int kind = depth > 200 ? 0 : in.ConsumeIntegralInRange(0, 9);
    const auto bits = kind > 0 && kind < 6 ? in.ConsumeIntegral<std::uint64_t>() : 0;
    if (kind == 1) return bits % 2 == 0;
    if (kind == 2) return bits;
    if (kind == 3) return static_cast<std::int64_t>(bits);
    if (kind == 4) return std::bit_cast<double>(bits);
    if (kind == 5) return Date(Date::duration(static_cast<std::int64_t>(bits)));
    if (kind == 6) return in.ConsumeRandomLengthString();
    if (kind == 7) {
        const auto object = std::make_shared<Object>(make(in, depth + 1), in.ConsumeIntegralInRange(0, 3));
        if (in.ConsumeBool()) return std::shared_ptr<BridgedDataEventType>(object);
        return std::shared_ptr<BridgedDataType>(object);
    }
    HostValue::Array elements;
    std::vector<HostValue::Entry> entries;
    for (auto count = kind > 7 ? in.ConsumeIntegralInRange(0, 40) : 0; count > 0 && in.remaining_bytes() > 0; --count) {
        elements.push_back(make(in, depth + 1));
        if (kind == 9) entries.push_back({in.ConsumeRandomLengthString(8), elements.back()});
    }
    if (kind == 9 && in.ConsumeBool() && !entries.empty()) entries[0].key = entries[0].value;
    if (kind == 8) return elements;
    return kind == 9 ? HostValue(HostValue::Dictionary(std::move(entries))) : nullptr;
}

void checkConverted(const JSON& json) {
    const JSON read = JSON::fromEncodedText(json.text());  // which looks at the text
    CORVANE_REQUIRE(read.exists() && jsontext::nesting(read.text()) <= jsontext::maximumDepth,
                    "it is not ours to write");
    CORVANE_REQUIRE(JSON(read.text()).text() == read.text(), "it does not come back");
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
    const auto event = std::make_shared<Object>(value, 0);
    try {
        checkConverted(BridgedDataEvent(event).toDict());
    } catch (const std::exception& refusal) {
        CORVANE_REQUIRE(!detail::isPlain(event->toDict()), std::string("found plain, and refused: ") + refusal.what());
    }
    return 0;
}
