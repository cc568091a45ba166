#include <corvane/Models/DataEvent.h>

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

AnyDataEvent::Base::~Base() = default;

void AnyDataEvent::destroy(const Base* box) noexcept {
    delete box;
}

JSON AnyDataEvent::toDict() const {
    const AnyDataEvent held(*this);  // the host's code, which is not called under the lock, may replace this object
    const Base* const box = held.box_;
    if (box->isEncoded.load(std::memory_order_acquire)) return *box->dict;
    JSON dict = box->makeDict();
    std::lock_guard lock(box->mutex);
    if (!box->dict) box->dict = std::move(dict);
    box->isEncoded.store(true, std::memory_order_release);
    return *box->dict;
}

}  // namespace corvane
