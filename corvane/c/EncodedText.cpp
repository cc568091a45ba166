#include <corvane/c/EncodedText.h>

#include <corvane/Bridge/Models/HostValue.h>
#include <corvane/Models/Encoder.h>
#include <corvane/Models/JSONParser.h>
#include <corvane/Platform/JSONText.h>
#include <corvane/c/Call.h>
#include <corvane/c/Value.h>
#include <corvane/c/corvane.h>

#include <algorithm>
#include <functional>
#include <string_view>
#include <vector>

namespace corvane::c {

namespace {

/// Writes what is read, which takes a third of the time that a tree of values would. A tree is what finds members of
/// one name, so it watches for them.
class Writer final : public JSONListener {
  public:
    Writer() { keys_.reserve(32); }

    void beginObject() override {
        objects_.push_back(keys_.size());
        encoder_.beginObject();
    }
    void endObject(std::size_t) override {
        keys_.resize(objects_.back());
        objects_.pop_back();
        encoder_.endObject();
    }
    void beginArray() override { encoder_.beginArray(); }
    void endArray(std::size_t) override { encoder_.endArray(); }
    void keyPart(std::string_view part) override { text_ += part; }
    void key(std::string_view lastPart) override {
        whole(lastPart, [this](std::string_view name) {
            note(std::hash<std::string_view>()(name));
            encoder_.key(name);
        });
    }
    void stringPart(std::string_view part) override { text_ += part; }
    void string(std::string_view lastPart) override {
        whole(lastPart, [this](std::string_view value) { encoder_.string(value); });
    }
    void integer(std::int64_t value) override { encoder_.integer(value); }
    void unsignedInteger(std::uint64_t value) override { encoder_.unsignedInteger(value); }
    void number(double value) override { encoder_.real(value); }
    void boolean(bool value) override { encoder_.boolean(value); }
    void null() override { encoder_.null(); }

    /// Whether two members of an object may have one name.
    [[nodiscard]] bool isDoubtful() const { return isDoubtful_; }
    [[nodiscard]] JSON take() && { return std::move(encoder_).takeJSON(); }

  private:
    static constexpr std::size_t few = 64;  // members, up to which each is compared with each

    template <class Use>
    void whole(std::string_view lastPart, Use use) {
        if (text_.empty()) return use(lastPart);
        text_ += lastPart;
        use(text_);
        text_.clear();
    }
    void note(std::size_t hash) {
        const auto first = keys_.begin() + static_cast<std::ptrdiff_t>(objects_.back());
        isDoubtful_ = isDoubtful_ || keys_.end() - first >= static_cast<std::ptrdiff_t>(few) ||
                      std::find(first, keys_.end(), hash) != keys_.end();
        if (!isDoubtful_) keys_.push_back(hash);
    }

    Encoder encoder_;
    std::string text_;
    std::vector<std::size_t> objects_;  // where the keys of each open object begin
    std::vector<std::size_t> keys_;
    bool isDoubtful_ = false;
};

}  // namespace

JSON encodedObject(const char* json) {
    if (!json) refuse(CORVANE_NO_OBJECT, "a null pointer stands where a text is needed: the JSON");
    Writer writer;
    if (!parseJSON(json, jsontext::maximumDepth, writer)) refuse(CORVANE_INVALID_JSON, "a text is not JSON");
    JSON object = writer.isDoubtful() ? detail::toJsonObject(dictionaryOf(valueOf(json))) : std::move(writer).take();
    if (!object.isObject()) refuse(CORVANE_INVALID_JSON, "a JSON text is not an object");
    return object;
}

}  // namespace corvane::c
