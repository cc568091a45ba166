// Dictionaries and arrays.

#include <corvane/c/Call.h>
#include <corvane/c/Value.h>
#include <corvane/c/corvane.h>

#include <cmath>

using namespace corvane;
using namespace corvane::c;

namespace {

HostValue real(double value) {
    if (!std::isfinite(value)) refuse(CORVANE_INVALID_ARGUMENT, "a number is not finite");
    return value;
}

template <class Make>
bool set(corvane_value* dictionary, const char* key, corvane_error* error, Make make) {
    return call(error, [&] {
        const Used<Value> used(dictionary);
        std::string name = text(key, "the key");
        used->set(std::move(name), make());
    });
}

template <class Make>
bool add(corvane_value* array, corvane_error* error, Make make) {
    return call(error, [&] {
        const Used<Value> used(array);
        used->add(make());
    });
}

corvane_value* made(HostValue value) {
    return static_cast<corvane_value*>(make<Value>(value));
}

}  // namespace

corvane_value* corvane_dictionary_create(corvane_error* error) {
    return call(error, [] { return made(HostValue::Dictionary()); });
}
corvane_value* corvane_array_create(corvane_error* error) {
    return call(error, [] { return made(HostValue::Array()); });
}
corvane_value* corvane_value_from_json(const char* json, corvane_error* error) {
    return call(error, [&] {
        if (!json) refuse(CORVANE_NO_OBJECT, "a null pointer stands where a text is needed: the JSON");
        return made(valueOf(json));
    });
}

bool corvane_dictionary_set_null(corvane_value* dictionary, const char* key, corvane_error* error) {
    return set(dictionary, key, error, [] { return nullptr; });
}
bool corvane_dictionary_set_bool(corvane_value* dictionary, const char* key, bool value, corvane_error* error) {
    return set(dictionary, key, error, [&] { return value; });
}
bool corvane_dictionary_set_integer(corvane_value* dictionary, const char* key, int64_t value, corvane_error* error) {
    return set(dictionary, key, error, [&] { return value; });
}
bool corvane_dictionary_set_unsigned(corvane_value* dictionary, const char* key, uint64_t value, corvane_error* error) {
    return set(dictionary, key, error, [&] { return value; });
}
bool corvane_dictionary_set_real(corvane_value* dictionary, const char* key, double value, corvane_error* error) {
    return set(dictionary, key, error, [&] { return real(value); });
}
bool corvane_dictionary_set_string(corvane_value* dictionary, const char* key, const char* value,
                                   corvane_error* error) {
    return set(dictionary, key, error, [&] { return text(value, "the string"); });
}
bool corvane_dictionary_set_value(corvane_value* dictionary, const char* key, corvane_value* value,
                                  corvane_error* error) {
    return set(dictionary, key, error, [&] { return Used<Value>(value)->value(); });
}

bool corvane_array_add_null(corvane_value* array, corvane_error* error) {
    return add(array, error, [] { return nullptr; });
}
bool corvane_array_add_bool(corvane_value* array, bool value, corvane_error* error) {
    return add(array, error, [&] { return value; });
}
bool corvane_array_add_integer(corvane_value* array, int64_t value, corvane_error* error) {
    return add(array, error, [&] { return value; });
}
bool corvane_array_add_unsigned(corvane_value* array, uint64_t value, corvane_error* error) {
    return add(array, error, [&] { return value; });
}
bool corvane_array_add_real(corvane_value* array, double value, corvane_error* error) {
    return add(array, error, [&] { return real(value); });
}
bool corvane_array_add_string(corvane_value* array, const char* value, corvane_error* error) {
    return add(array, error, [&] { return text(value, "the string"); });
}
bool corvane_array_add_value(corvane_value* array, corvane_value* value, corvane_error* error) {
    return add(array, error, [&] { return Used<Value>(value)->value(); });
}
