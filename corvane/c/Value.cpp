#include <corvane/c/Value.h>

#include <corvane/Models/JSONParser.h>
#include <corvane/Platform/JSONText.h>
#include <corvane/c/Call.h>
#include <corvane/c/corvane.h>

#include <utility>

namespace corvane::c {

namespace {

/// Makes a value of what is read, from the inside out.
class Builder final : public JSONListener {
  public:
    void beginObject() override { open_.emplace_back(); }
    void endObject(std::size_t) override {
        auto entries = std::move(open_.back().entries);
        open_.pop_back();
        put(HostValue::Dictionary(std::move(entries)));
    }
    void beginArray() override { open_.emplace_back().isArray = true; }
    void endArray(std::size_t) override {
        auto elements = std::move(open_.back().elements);
        open_.pop_back();
        put(std::move(elements));
    }
    void keyPart(std::string_view part) override { text_ += part; }
    void key(std::string_view lastPart) override { open_.back().key = take(lastPart); }
    void stringPart(std::string_view part) override { text_ += part; }
    void string(std::string_view lastPart) override { put(take(lastPart)); }
    void integer(std::int64_t value) override { put(value); }
    void unsignedInteger(std::uint64_t value) override { put(value); }
    void number(double value) override { put(value); }
    void boolean(bool value) override { put(value); }
    void null() override { put(nullptr); }

    [[nodiscard]] HostValue value() && { return std::move(value_); }

  private:
    struct Level {
        bool isArray = false;
        std::string key;
        HostValue::Array elements;
        std::vector<HostValue::Entry> entries;
    };

    std::string take(std::string_view lastPart) {
        text_ += lastPart;
        return std::exchange(text_, {});
    }
    void put(HostValue value) {
        if (open_.empty()) {
            value_ = std::move(value);
        } else if (Level& level = open_.back(); level.isArray) {
            level.elements.push_back(std::move(value));
        } else {
            level.entries.push_back({std::move(level.key), std::move(value)});
        }
    }

    std::string text_;
    std::vector<Level> open_;
    HostValue value_;
};

}  // namespace

Value::Value(const HostValue& value) : isDictionary_(value.dictionary()) {
    if (isDictionary_) {
        entries_ = value.dictionary()->entries();
    } else {
        elements_ = *value.array();
    }
}

void Value::require(bool isDictionary) const {
    if (isDictionary == isDictionary_) return;
    refuse(CORVANE_WRONG_KIND, isDictionary ? "a value is an array where it is to be a dictionary"
                                            : "a value is a dictionary where it is to be an array");
}

void Value::set(std::string key, HostValue value) {
    require(true);
    Lock lock(mutex_);
    entries_.push_back({std::move(key), std::move(value)});
}

void Value::add(HostValue element) {
    require(false);
    Lock lock(mutex_);
    elements_.push_back(std::move(element));
}

HostValue Value::value() const {
    Lock lock(mutex_);
    if (isDictionary_) return HostValue::Dictionary(entries_);
    return elements_;
}

HostValue valueOf(std::string_view json) {
    Builder builder;
    if (!parseJSON(json, jsontext::maximumDepth, builder)) refuse(CORVANE_INVALID_JSON, "a text is not JSON");
    HostValue value = std::move(builder).value();
    if (!value.dictionary() && !value.array()) {
        refuse(CORVANE_INVALID_JSON, "a JSON text is neither an object nor an array");
    }
    return value;
}

HostValue::Dictionary dictionaryOf(const HostValue& value) {
    const auto* dictionary = value.dictionary();
    if (!dictionary) refuse(CORVANE_WRONG_KIND, "data is an array where it is to be a dictionary");
    // Says by throwing what is wrong with it.
    if (!detail::isPlain(*dictionary)) static_cast<void>(detail::toJsonObject(*dictionary));
    return *dictionary;
}

HostValue::Dictionary dictionaryOf(const void* value) {
    return dictionaryOf(Used<Value>(value)->value());
}

HostValue::Dictionary dictionaryOfJSON(const char* json) {
    if (!json) refuse(CORVANE_NO_OBJECT, "a null pointer stands where a text is needed: the JSON");
    return dictionaryOf(valueOf(json));
}

std::string dataName(const char* given) {
    std::string name = text(given, "the name of the data");
    if (name == CORVANE_EVENT_DATA || name == CORVANE_TIMED_DATA) {
        refuse(CORVANE_INVALID_ARGUMENT, "the library itself makes the data of this name: " + name);
    }
    return name;
}

}  // namespace corvane::c
