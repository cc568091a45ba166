#include <corvane/Bridge/Data/StackEntry.h>

#include <corvane/Bridge/Models/BridgedDataEvent.h>
#include <corvane/Bridge/Models/Refusal.h>
#include <corvane/Models/OwnJSON.h>
#include <corvane/Models/SessionData.h>

#include <utility>
#include <variant>

namespace corvane::bridge {

namespace {

/// What was asked of a data event, with the texts that its entry refers to.
struct Asked {
    JSON toDict() const {
        if (const auto* error = std::get_if<AnyError>(&dict)) error->rethrow();
        if (const auto* plain = std::get_if<HostValue::Dictionary>(&dict)) return detail::toJsonObject(*plain);
        return std::get<JSON>(dict);
    }
    static constexpr bool isEncodedByLibrary = true;

    std::string key;
    std::optional<std::string> file;
    /// A dictionary whose conversion cannot fail and asks nobody is left to the first event that needs it.
    std::variant<HostValue::Dictionary, JSON, AnyError> dict;
};

AnyDataEventEntry entryOf(Asked asked, DataEventTraits traits, const char* file, std::uint_least32_t line) {
    AnyDataEvent data(std::move(asked));
    const auto* held = data.as<Asked>();
    const std::string_view key = held->key;
    if (held->file) file = held->file->c_str();
    return {key, std::move(data), traits, file, line};
}

std::string usableName(std::string name) {
    requireUTF8(name, "the data event's name");
    return name;
}

std::string nameOf(const std::shared_ptr<const BridgedDataEventType>& data) {
    if (!data) throw BridgeError(BridgeError::missingObject, "the data event");
    return usableName(data->dataName());
}

}  // namespace

AnyDataEventEntry stackEntry(const std::shared_ptr<const BridgedDataEventType>& data, BridgedDataEventTraits traits,
                             Place place, std::optional<AnyError>& failure) {
    Asked asked{nameOf(data), std::move(place.ownFile), {}};
    try {
        auto dictionary = data->toDict();
        if (detail::isPlain(dictionary)) {
            asked.dict = std::move(dictionary);
        } else {
            asked.dict = detail::toJsonObject(dictionary);
        }
    } catch (...) {
        failure = AnyError::current();
        asked.dict = *failure;
    }
    return entryOf(std::move(asked), traits.traits(), place.file, place.line);
}

AnyDataEventEntry stackEntry(std::string name, JSON dictionary, BridgedDataEventTraits traits, Place place) {
    auto object = OwnJSON::is(dictionary) ? detail::requireObject(std::move(dictionary))
                                          : detail::requireHostObject(std::move(dictionary));
    return entryOf({usableName(std::move(name)), std::move(place.ownFile), std::move(object)}, traits.traits(),
                   place.file, place.line);
}

DataType stackEntryType() {
    return DataType::of<Asked>();
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
