#include <corvane/Models/JSON.h>

#include <corvane/Models/JSONTree.h>
#include <corvane/Models/OwnJSON.h>
#include <corvane/Platform/Require.h>

#include <cmath>
#include <limits>
#include <mutex>
#include <utility>

namespace corvane {

namespace {
constexpr int maximumParseDepth = 512;
}

// Text, a tree, or both. Text that the library wrote is taken at its word; a part of a larger tree keeps that alive.
struct JSON::Storage {
    // Numbers of parsed text are of one generic kind; the library's own text keeps exact kinds.
    bool genericNumbers = false;
    // The text was there from the start, and does not change any more.
    bool isWritten = false;
    // ... and it is known to be JSON.
    bool isOwn = false;
    mutable std::once_flag textOnce;
    mutable std::string text;
    mutable std::once_flag treeOnce;
    mutable std::unique_ptr<const boost::json::value> ownTree;
    mutable const boost::json::value* tree = nullptr;
    std::shared_ptr<const Storage> parent;

    // The value, or nullptr when there is none.
    const boost::json::value* value() const {
        std::call_once(treeOnce, [this] {
            if (tree || text.empty()) return;
            auto parsed = jsontree::parse(text, maximumParseDepth);
            if (!parsed) return;
            ownTree = std::make_unique<const boost::json::value>(*std::move(parsed));
            tree = ownTree.get();
        });
        return tree;
    }

    static std::shared_ptr<const Storage> part(std::shared_ptr<const Storage> parent, const boost::json::value* tree) {
        auto storage = std::make_shared<Storage>();
        storage->genericNumbers = parent->genericNumbers;
        storage->tree = tree;
        if (tree) storage->parent = std::move(parent);
        return storage;
    }
};

JSONError::JSONError(Code code)
    : Error("Corvane.JSONError", code, "the JSON value is neither an object nor, where that is allowed, an array") {}
JSONError::~JSONError() = default;

std::optional<JSONError::Code> JSONError::fromCode(int code) noexcept {
    if (code == invalidTopLevelValue) return invalidTopLevelValue;
    return std::nullopt;
}

JSON::JSON(std::shared_ptr<const Storage> storage) : storage_(std::move(storage)) {}

JSON::JSON(std::string_view bytes) {
    // The text is what the tree writes: what was given may hold blanks, or may not be JSON at all.
    auto storage = std::make_shared<Storage>();
    storage->genericNumbers = true;
    if (auto parsed = jsontree::parse(bytes, maximumParseDepth)) {
        storage->ownTree = std::make_unique<const boost::json::value>(*std::move(parsed));
        storage->tree = storage->ownTree.get();
    }
    storage_ = std::move(storage);
}

JSON JSON::fromEncodedText(std::string text) {
    auto storage = std::make_shared<Storage>();
    storage->text = std::move(text);
    storage->isWritten = true;
    return JSON(std::move(storage));
}

JSON OwnJSON::of(std::string text) {
    auto storage = std::make_shared<JSON::Storage>();
    storage->text = std::move(text);
    storage->isWritten = storage->isOwn = true;
    return JSON(std::move(storage));
}

bool OwnJSON::is(const JSON& json) noexcept {
    return json.storage_->isOwn;
}

JSON JSON::operator[](std::string_view key) const {
    const auto* value = storage_->value();
    const auto* object = value ? value->if_object() : nullptr;
    return JSON(Storage::part(storage_, object ? object->if_contains({key.data(), key.size()}) : nullptr));
}

JSON JSON::element(std::int64_t index) const {
    const auto* value = storage_->value();
    const auto* array = value ? value->if_array() : nullptr;
    const bool inside = array && index >= 0 && static_cast<std::uint64_t>(index) < array->size();
    return JSON(Storage::part(storage_, inside ? &(*array)[static_cast<std::size_t>(index)] : nullptr));
}

bool JSON::exists() const {
    return storage_->isOwn || storage_->value() != nullptr;
}

bool JSON::isNull() const {
    const auto* value = storage_->value();
    return value && value->is_null();
}

bool JSON::isObject() const {
    // The library's own text says so in its first character; only other text must be parsed.
    if (storage_->isOwn) return storage_->text.starts_with('{');
    const auto* value = storage_->value();
    return value && value->is_object();
}

std::optional<std::string> JSON::string() const {
    const auto* value = storage_->value();
    const auto* string = value ? value->if_string() : nullptr;
    if (!string) return std::nullopt;
    return std::string(string->data(), string->size());
}

std::optional<std::int64_t> JSON::integer() const {
    const auto* value = storage_->value();
    if (!value) return std::nullopt;
    if (const auto* number = value->if_int64()) return *number;
    const auto* real = value->if_double();
    if (real && storage_->genericNumbers && *real == std::trunc(*real) && std::abs(*real) < 0x1p63) {
        return static_cast<std::int64_t>(*real);
    }
    return std::nullopt;
}

std::optional<std::uint64_t> JSON::unsignedInteger() const {
    const auto* value = storage_->value();
    if (const auto* number = value ? value->if_uint64() : nullptr) return *number;
    const auto number = integer();
    if (!number || *number < 0) return std::nullopt;
    return static_cast<std::uint64_t>(*number);
}

std::optional<double> JSON::double_() const {
    const auto* value = storage_->value();
    if (!value) return std::nullopt;
    if (const auto* real = value->if_double()) return *real;
    if (const auto* number = value->if_uint64()) return static_cast<double>(*number);
    const auto* number = value->if_int64();
    if (number && storage_->genericNumbers) return static_cast<double>(*number);
    return std::nullopt;
}

std::optional<bool> JSON::bool_() const {
    const auto* value = storage_->value();
    const auto* boolean = value ? value->if_bool() : nullptr;
    if (!boolean) return std::nullopt;
    return *boolean;
}

std::optional<JSON::Array> JSON::array() const {
    const auto* value = storage_->value();
    const auto* elements = value ? value->if_array() : nullptr;
    if (!elements) return std::nullopt;
    Array array;
    array.reserve(elements->size());
    for (const auto& part : *elements) array.push_back(JSON(Storage::part(storage_, &part)));
    return array;
}

std::optional<JSON::Object> JSON::object() const {
    const auto* value = storage_->value();
    const auto* members = value ? value->if_object() : nullptr;
    if (!members) return std::nullopt;
    Object object;
    for (const auto& member : *members) {
        object.emplace(std::string(member.key().data(), member.key().size()),
                       JSON(Storage::part(storage_, &member.value())));
    }
    return object;
}

std::optional<JSON::Number> JSON::number() const {
    if (auto number = integer()) return Number(*number);
    if (auto number = double_()) return Number(*number);
    if (auto boolean = bool_()) return Number(*boolean);
    return std::nullopt;
}

std::optional<JSON::Value> JSON::any() const {
    if (!exists()) return std::nullopt;
    if (isNull()) return Value(nullptr);
    if (auto boolean = bool_()) return Value(*boolean);
    if (auto text = string()) return Value(*std::move(text));
    if (auto elements = array()) return Value(*std::move(elements));
    if (auto members = object()) return Value(*std::move(members));
    const auto* value = storage_->value();
    if (const auto* number = value->if_int64()) return Value(*number);
    return Value(*double_());
}

std::string JSON::toData(JSONWritingOptions options) const {
    const bool isCompact = !options.prettyPrinted && !options.sortedKeys;
    if (isCompact && isObject()) return text();
    const auto* value = storage_->value();
    if (!value || !value->is_structured()) throw JSONError(JSONError::invalidTopLevelValue);
    return isCompact ? text() : jsontree::write(*value, options);
}

JSON JSON::payload() const {
    if (!isObject()) throw JSONError(JSONError::invalidTopLevelValue);
    return *this;
}

const std::string& JSON::text() const {
    if (storage_->isWritten) return storage_->text;
    std::call_once(storage_->textOnce, [this] {
        if (storage_->tree) storage_->text = jsontree::write(*storage_->tree, {});
    });
    return storage_->text;
}

std::string JSON::description() const {
    const auto* value = storage_->value();
    return value ? jsontree::describe(*value) : "nil";
}

}  // namespace corvane
