#include <corvane/Bridge/Data/StackEntry.h>

#include <corvane/Bridge/Models/BridgedDataEvent.h>
#include <corvane/Bridge/Models/Refusal.h>
#include <corvane/Models/SessionData.h>

#include <utility>
#include <variant>

namespace corvane::bridge {

namespace {

/// Converted data, with the texts that its entry refers to.
struct Converted {
    JSON toDict() const {
        if (const auto* error = std::get_if<AnyError>(&dict)) error->rethrow();
        return std::get<JSON>(dict);
    }
    static constexpr bool isEncodedByLibrary = true;

    std::string key;
    std::optional<std::string> file;
    std::variant<JSON, AnyError> dict;
};

AnyDataEventEntry entryOf(Converted converted, DataEventTraits traits, const char* file, std::uint_least32_t line) {
    AnyDataEvent data(std::move(converted));
    const auto* held = data.as<Converted>();
    const std::string_view key = held->key;
    if (held->file) file = held->file->c_str();
    return {key, std::move(data), traits, file, line};
}

std::string nameOf(const std::shared_ptr<const BridgedDataEventType>& data) {
    if (!data) throw BridgeError(BridgeError::missingObject, "the data event");
    std::string name = data->dataName();
    requireUTF8(name, "the data event's name");
    return name;
}

}  // namespace

AnyDataEventEntry stackEntry(const std::shared_ptr<const BridgedDataEventType>& data, BridgedDataEventTraits traits,
                             Place place, std::optional<AnyError>& failure) {
    Converted converted{nameOf(data), std::move(place.ownFile), JSON::fromEncodedText({})};
    try {
        converted.dict = BridgedDataEvent(data).toDict();
    } catch (...) {
        failure = AnyError::current();
        converted.dict = *failure;
    }
    return entryOf(std::move(converted), traits.traits(), place.file, place.line);
}

DataType stackEntryType() {
    return DataType::of<Converted>();
}

AnyDataEventEntry sessionEntry(const BridgedSessionData& data, BridgedDataEventTraits traits) {
    requireUTF8(data.key(), "the key of the session data");
    std::string stackKey = "SessionData<" + nameOf(data.data()) + ">";
    JSON dict = SessionData{data.key(), BridgedDataEvent(data.data())}.toDict();
    return entryOf({std::move(stackKey), std::nullopt, std::move(dict)}, traits.traits(), "", 0);
}

EventSubmitCompletion libraryCompletion(BridgedSubmitCompletion completion) {
    if (!completion) return {};
    return [completion = std::move(completion)](const EventSubmitResult& result) {
        if (const ProcessEvent* event = result.event()) {
            const BridgedProcessEvent bridged(*event);
            completion(&bridged, nullptr);
        } else {
            const BridgedError error = BridgedError::of(*result.error());
            completion(nullptr, &error);
        }
    };
}

}  // namespace corvane::bridge
