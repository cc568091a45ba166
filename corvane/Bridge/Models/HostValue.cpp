#include <corvane/Bridge/Models/HostValue.h>

#include <corvane/Bridge/Models/BridgedDataEventType.h>
#include <corvane/Models/DataEvent.h>
#include <corvane/Models/Encoder.h>

#include <algorithm>
#include <cmath>
#include <string_view>
#include <unordered_map>
#include <utility>

namespace corvane {

/// What an array or a dictionary holds.
struct HostValue::Node {
    Array elements;
    std::vector<Entry> entries;
    mutable const Node* next = nullptr;  // while it waits to be deleted

    // A node that falls free while another one is being deleted waits for it, so that the depth of a value is no depth
    // of the stack. The list runs through the nodes: nothing is allocated where nothing may fail.
    static void release(const Node* node) noexcept {
        thread_local const Node* waiting = nullptr;
        thread_local bool isDeleting = false;
        node->next = waiting;
        waiting = node;
        if (isDeleting) return;
        isDeleting = true;
        while (waiting) {
            const Node* first = waiting;
            waiting = first->next;
            delete first;
        }
        isDeleting = false;
    }
};

HostValue::NodeRef HostValue::makeNode(Array elements, std::vector<Entry> entries) {
    return {new Node{std::move(elements), std::move(entries)}, &Node::release};
}

HostValue::HostValue(const char* value) : value_(nullptr) {
    if (value) value_ = std::string(value);
}

HostValue::HostValue(Array elements) : value_(makeNode(std::move(elements), {})) {}
HostValue::HostValue(Dictionary dictionary) : value_(std::move(dictionary)) {}

const HostValue::Array* HostValue::array() const {
    const auto* node = std::get_if<NodeRef>(&value_);
    return node ? &(*node)->elements : nullptr;
}

const BridgedDataEventType* HostValue::dataEvent() const {
    const auto* object = std::get_if<Object>(&value_);
    return object ? object->dataEvent : nullptr;
}

const BridgedDataType* HostValue::data() const {
    const auto* object = std::get_if<Object>(&value_);
    return object ? object->data : nullptr;
}

HostValue::Dictionary::Dictionary(std::initializer_list<Entry> entries) : Dictionary(std::vector<Entry>(entries)) {}

HostValue::Dictionary::Dictionary(std::vector<Entry> entries)
    : node_(entries.empty() ? nullptr : makeNode({}, std::move(entries))) {}

const std::vector<HostValue::Entry>& HostValue::Dictionary::entries() const {
    static const std::vector<Entry> none;
    return node_ ? node_->entries : none;
}

namespace {

/// Which entries of a dictionary count: the last one of each key. All keys are strings.
class LastOfKey {
  public:
    explicit LastOfKey(const std::vector<HostValue::Entry>& entries) : entries_(entries) {
        if (entries.size() <= few) return;
        for (std::size_t i = 0; i < entries.size(); ++i) last_[*entries[i].key.string()] = i;
    }

    [[nodiscard]] bool counts(std::size_t index) const {
        const std::string& key = *entries_[index].key.string();
        if (!last_.empty()) return last_.at(key) == index;
        const auto later = entries_.begin() + static_cast<std::ptrdiff_t>(index) + 1;
        return std::none_of(later, entries_.end(), [&](const auto& entry) { return *entry.key.string() == key; });
    }

  private:
    static constexpr std::size_t few = 16;  // below it, looking through the entries is cheaper than a map

    const std::vector<HostValue::Entry>& entries_;
    std::unordered_map<std::string_view, std::size_t> last_;
};

class Converter {
  public:
    using Failure = DataEventError::Code;

    /// @param acceptsDataEvent whether an object may be converted as a data event here
    void convert(const HostValue& value, bool acceptsDataEvent, Failure failure) {
        switch (value.kind()) {
            case HostValue::Kind::null:
                return encoder_.null();
            case HostValue::Kind::boolean:
                return encoder_.boolean(*value.bool_());
            case HostValue::Kind::integer:
                return encoder_.integer(*value.integer());
            case HostValue::Kind::unsignedInteger:
                return encoder_.unsignedInteger(*value.unsignedInteger());
            case HostValue::Kind::real:
                return encoder_.real(*value.double_());
            case HostValue::Kind::string:
                return encoder_.string(*value.string());
            case HostValue::Kind::date:
                return encoder_.date(*value.date());
            case HostValue::Kind::array:
                return convert(*value.array());
            case HostValue::Kind::dictionary:
                return convert(*value.dictionary(), true, DataEventError::dataDictValueNotSerializable);
            case HostValue::Kind::object:
                return convertObject(value, acceptsDataEvent, failure);
        }
    }

    void convert(const HostValue::Dictionary& dictionary, bool acceptsDataEvents, Failure failure) {
        const auto& entries = dictionary.entries();
        if (!std::all_of(entries.begin(), entries.end(), [](const auto& entry) { return entry.key.string(); })) {
            throw DataEventError(DataEventError::dataDictKeyNotSerializable);
        }
        const LastOfKey last(entries);
        encoder_.beginObject();
        for (std::size_t i = 0; i < entries.size(); ++i) {
            if (!last.counts(i)) continue;
            encoder_.key(*entries[i].key.string());
            convert(entries[i].value, acceptsDataEvents, failure);
        }
        encoder_.endObject();
    }

    [[nodiscard]] JSON take() && { return std::move(encoder_).takeJSON(); }

  private:
    void convert(const HostValue::Array& elements) {
        encoder_.beginArray();
        for (const auto& element : elements) convert(element, true, DataEventError::dataArrayValueNotSerializable);
        encoder_.endArray();
    }

    void convertObject(const HostValue& value, bool acceptsDataEvent, Failure failure) {
        // An object may answer with itself, at no depth of the JSON.
        if (++objects_ > jsontext::maximumDepth) throw EncodingError(EncodingError::tooDeep, {});
        if (const auto* event = acceptsDataEvent ? value.dataEvent() : nullptr) {
            convert(event->toDict(), true, DataEventError::dataDictValueNotSerializable);
        } else if (const auto* data = value.data()) {
            BridgedError error("Corvane.HostError", 0, "an object could not convert itself");
            const auto converted = data->toJsonValueAndReturnError(&error);
            if (!converted) throw BridgedError(error);
            convert(*converted, acceptsDataEvent, failure);
        } else {
            throw DataEventError(failure);
        }
        --objects_;
    }

    Encoder encoder_;
    int objects_ = 0;  // whose conversion is under way
};

bool isPlainValue(const HostValue& value, int depth);

/// @param depth the levels that there may be, this one counted
bool isPlainDictionary(const HostValue::Dictionary& dictionary, int depth) {
    const auto& entries = dictionary.entries();
    return depth > 0 && std::all_of(entries.begin(), entries.end(), [&](const auto& entry) {
               const std::string* key = entry.key.string();
               return key && jsontext::isUTF8(*key) && isPlainValue(entry.value, depth - 1);
           });
}

bool isPlainValue(const HostValue& value, int depth) {
    switch (value.kind()) {
        case HostValue::Kind::real:
            return std::isfinite(*value.double_());
        case HostValue::Kind::string:
            return jsontext::isUTF8(*value.string());
        case HostValue::Kind::array:
            return depth > 0 && std::all_of(value.array()->begin(), value.array()->end(),
                                            [&](const auto& element) { return isPlainValue(element, depth - 1); });
        case HostValue::Kind::dictionary:
            return isPlainDictionary(*value.dictionary(), depth);
        case HostValue::Kind::object:
            return false;
        default:
            return true;
    }
}

}  // namespace

JSON toJsonValue(const HostValue& value) {
    Converter converter;
    converter.convert(value, false, DataEventError::dataNotSerializable);
    return std::move(converter).take();
}

std::optional<JSON> toJsonValueAndReturnError(const HostValue& value, BridgedError* error) {
    try {
        return toJsonValue(value);
    } catch (...) {
        if (error) *error = BridgedError::of(AnyError::current());
        return std::nullopt;
    }
}

std::optional<std::string> toDataWithOptions(const JSON& json, JSONWritingOptions options, BridgedError* error) {
    try {
        return json.toData(options);
    } catch (...) {
        if (error) *error = BridgedError::of(AnyError::current());
        return std::nullopt;
    }
}

bool detail::isPlain(const HostValue::Dictionary& dictionary) {
    return isPlainDictionary(dictionary, jsontext::maximumDepth);
}

JSON detail::toJsonObject(const HostValue::Dictionary& dictionary) {
    Converter converter;
    converter.convert(dictionary, false, DataEventError::dataNotSerializable);
    return std::move(converter).take();
}

}  // namespace corvane
