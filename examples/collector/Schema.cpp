#include "Schema.h"

#include <algorithm>
#include <string_view>

namespace collector {

namespace {

using corvane::JSON;

constexpr int mostDetours = 100;  // of schemas that refer to each other, on one value

const char* typeOf(const JSON& value) {
    if (value.isNull()) return "null";
    if (value.bool_()) return "boolean";
    if (value.integer() || value.unsignedInteger()) return "integer";
    if (value.double_()) return "number";
    if (value.isObject()) return "object";
    return value.text().starts_with('"') ? "string" : "array";
}

bool isOfType(std::string_view type, std::string_view expected) {
    return type == expected || (type == "integer" && expected == "number");
}

// Integers are compared as such: a double does not tell the largest apart.
bool isLess(const JSON& a, const JSON& b) {
    const auto integerA = a.integer();
    const auto integerB = b.integer();
    if (integerA && integerB) return *integerA < *integerB;
    const auto unsignedA = a.unsignedInteger();
    const auto unsignedB = b.unsignedInteger();
    if (unsignedA && unsignedB) return *unsignedA < *unsignedB;
    return a.double_().value_or(0) < b.double_().value_or(0);
}

bool areEqual(const JSON& a, const JSON& b) {
    const std::string_view type = typeOf(a);
    if (type != typeOf(b)) return false;
    if (type == "integer" || type == "number") return !isLess(a, b) && !isLess(b, a);
    if (type == "object" || type == "array") return a.toData({.sortedKeys = true}) == b.toData({.sortedKeys = true});
    return type == "string" ? a.string() == b.string() : a.text() == b.text();
}

std::string shown(const JSON& value) {
    constexpr std::size_t longest = 60;
    return value.text().size() <= longest ? value.text() : typeOf(value);
}

class Validation {
  public:
    explicit Validation(std::vector<Mismatch>& mismatches) : mismatches_(mismatches) {}

    void check(const Schema& schema, const JSON& value, const std::string& path, int detours = 0);

  private:
    void fail(const std::string& path, std::string reason) { mismatches_.push_back({path, std::move(reason)}); }
    bool isAllowed(const Schema& schema, const JSON& value, const std::string& path, int detours);
    void checkChoices(const Schema& schema, const JSON& value, const std::string& path, int detours);
    void checkValues(const Schema& schema, const JSON& value, const std::string& path);
    void checkNumber(const Schema& schema, const JSON& value, const std::string& path);
    void checkArray(const Schema& schema, const JSON::Array& array, const std::string& path);
    void checkObject(const Schema& schema, const JSON::Object& object, const std::string& path);

    std::vector<Mismatch>& mismatches_;
};

bool Validation::isAllowed(const Schema& schema, const JSON& value, const std::string& path, int detours) {
    std::vector<Mismatch> found;
    Validation(found).check(schema, value, path, detours);
    return found.empty();
}

void Validation::checkChoices(const Schema& schema, const JSON& value, const std::string& path, int detours) {
    if (schema.reference) check(*schema.reference, value, path, detours);
    for (const Schema& part : schema.allOf) check(part, value, path, detours);
    const auto allows = [&](const Schema& choice) { return isAllowed(choice, value, path, detours); };
    if (!schema.anyOf.empty() && std::ranges::none_of(schema.anyOf, allows)) {
        check(schema.anyOf.front(), value, path, detours);  // the others are mostly null
    }
    if (!schema.condition) return;
    const auto& next = allows(*schema.condition) ? schema.consequence : schema.alternative;
    if (next) check(*next, value, path, detours);
}

void Validation::checkValues(const Schema& schema, const JSON& value, const std::string& path) {
    if (!schema.values) return;
    const auto isValue = [&](const JSON& allowed) { return areEqual(value, allowed); };
    if (std::ranges::any_of(*schema.values, isValue)) return;
    fail(path, "is " + shown(value) + ", which is not among the values that it may have");
}

void Validation::checkNumber(const Schema& schema, const JSON& value, const std::string& path) {
    if (schema.minimum && isLess(value, *schema.minimum)) {
        fail(path, "is " + shown(value) + ", less than " + schema.minimum->text());
    }
    if (schema.maximum && isLess(*schema.maximum, value)) {
        fail(path, "is " + shown(value) + ", more than " + schema.maximum->text());
    }
}

void Validation::checkArray(const Schema& schema, const JSON::Array& array, const std::string& path) {
    if (array.size() < schema.minItems.value_or(0) || array.size() > schema.maxItems.value_or(array.size())) {
        fail(path, "has " + std::to_string(array.size()) + " elements");
    }
    if (!schema.items) return;
    for (std::size_t i = 0; i < array.size(); ++i) {
        check(*schema.items, array[i], path + "[" + std::to_string(i) + "]");
    }
}

void Validation::checkObject(const Schema& schema, const JSON::Object& object, const std::string& path) {
    const auto placeOf = [&](const std::string& name) { return path.empty() ? name : path + "." + name; };
    for (const std::string& name : schema.required) {
        if (!object.contains(name)) fail(placeOf(name), "is missing");
    }
    for (const auto& [name, member] : object) {
        if (const auto property = schema.properties.find(name); property != schema.properties.end()) {
            check(property->second, member, placeOf(name));
        } else if (schema.additionalProperties) {
            check(*schema.additionalProperties, member, placeOf(name));
        }
    }
}

void Validation::check(const Schema& schema, const JSON& value, const std::string& path, int detours) {
    if (detours > mostDetours) return fail(path, "cannot be checked: its schema refers to itself");
    if (schema.allowsNothing) return fail(path, "may not be there");
    checkChoices(schema, value, path, detours + 1);
    const std::string_view type = typeOf(value);
    const auto isType = [&](const std::string& expected) { return isOfType(type, expected); };
    if (!schema.types.empty() && std::ranges::none_of(schema.types, isType)) {
        return fail(path, "is " + shown(value) + ", which is not of type " + schema.types.front());
    }
    checkValues(schema, value, path);
    if (isOfType(type, "number")) checkNumber(schema, value, path);
    if (type == "array") checkArray(schema, *value.array(), path);
    if (type == "object") checkObject(schema, *value.object(), path);
}

}  // namespace

void validate(const Schema& schema, const JSON& value, const std::string& path, std::vector<Mismatch>& mismatches) {
    Validation(mismatches).check(schema, value, path);
}

}  // namespace collector
