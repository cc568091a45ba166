#include <corvane/Models/DataEvent.h>

#include <memory>

namespace corvane {

namespace {
const char* describe(DataEventError::Code code) {
    switch (code) {
        case DataEventError::invalidTopLevelJson:
            return "the data event's encoding is not a JSON object";
        case DataEventError::internalError:
            return "an object-facing data event has no structured encoding";
        case DataEventError::dataNotSerializable:
            return "a value of the data event cannot become JSON";
        case DataEventError::dataArrayValueNotSerializable:
            return "an element of an array cannot become JSON";
        case DataEventError::dataDictKeyNotSerializable:
            return "a key of a dictionary is not a string";
        case DataEventError::dataDictValueNotSerializable:
            return "a value of a dictionary cannot become JSON";
    }
    return "the data event cannot become JSON";
}
}  // namespace

DataEventError::DataEventError(Code code) : Error("Corvane.DataEventError", code, describe(code)) {}
DataEventError::~DataEventError() = default;

JSON detail::requireObject(JSON json) {
    if (!json.isObject()) throw DataEventError(DataEventError::invalidTopLevelJson);
    return json;
}

JSON detail::requireHostObject(JSON json) {
    // Text that was taken as encoded may be none.
    if (!json.exists() && !json.text().empty()) throw EncodingError(EncodingError::malformed, {});
    json = requireObject(std::move(json));
    if (jsontext::nesting(json.text()) > jsontext::maximumDepth) throw EncodingError(EncodingError::tooDeep, {});
    return json;
}

AnyDataEvent::Base::~Base() {
    delete dict.load(std::memory_order_acquire);
}

void AnyDataEvent::destroy(const Base* box) noexcept {
    delete box;
}

const JSON& AnyDataEvent::dict() const {
    if (const JSON* dict = box_->dict.load(std::memory_order_acquire)) return *dict;
    auto made = std::make_unique<const JSON>(box_->makeDict());
    const JSON* first = nullptr;
    if (!box_->dict.compare_exchange_strong(first, made.get(), std::memory_order_acq_rel)) return *first;
    return *made.release();
}

}  // namespace corvane
