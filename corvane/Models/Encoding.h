#pragma once

#include <corvane/Models/Encodable.h>
#include <corvane/Models/Encoder.h>
#include <corvane/Models/Fields.h>

#include <algorithm>
#include <chrono>
#include <concepts>
#include <optional>
#include <ranges>
#include <ratio>
#include <string>
#include <string_view>
#include <type_traits>

// How values of host types become JSON. Integers of every width, floating point and booleans become numbers; text
// becomes a string; a `std::chrono::system_clock` time point becomes whole milliseconds since 1970, and a duration
// whole milliseconds; an optional is its value, left out of its record when it has none (null inside an array); vectors
// and other ranges become arrays; string-keyed maps and records become objects; an enumeration becomes its integer, or
// text where the host supplies `std::string_view toText(Enum)` beside it; `JSON` is taken as it is. A type may encode
// itself with `void encode(corvane::Encoder&) const`.

#pragma GCC visibility push(hidden)  // what is made of host types belongs to the object that makes it

namespace corvane {

namespace detail {

template <class T>
void encodeRecord(Encoder& encoder, const T& value);

/// Whole milliseconds, truncated toward zero. Coarse and floating-point clocks reach further than milliseconds do.
template <class D>
void encodeMilliseconds(Encoder& encoder, D duration) {
    if constexpr (std::integral<typename D::rep> && std::ratio_less_equal_v<typename D::period, std::milli>) {
        encoder.integer(std::chrono::duration_cast<std::chrono::milliseconds>(duration).count());
    } else {
        encoder.date(std::chrono::duration<long double, std::milli>(duration).count());
    }
}

template <class T>
void encodeText(Encoder& encoder, const T& value) {
    if constexpr (TextArray<T>) {
        const auto end = std::find(std::begin(value), std::end(value), 0);
        encoder.string({reinterpret_cast<const char*>(value), static_cast<std::size_t>(end - std::begin(value))});
    } else if constexpr (UTF8Text<T>) {
        const std::u8string_view text = value;
        encoder.string({reinterpret_cast<const char*>(text.data()), text.size()});
    } else {
        encoder.string(value);
    }
}

/// Encodes what has been found to be encodable.
template <class T>
void encodeValue(Encoder& encoder, const T& value) {
    if constexpr (EncodesItself<T>) {
        value.encode(encoder);
    } else if constexpr (std::same_as<T, JSON>) {
        encoder.json(value);
    } else if constexpr (std::same_as<T, bool>) {
        encoder.boolean(value);
    } else if constexpr (TextEnumeration<T>) {
        encoder.string(toText(value));
    } else if constexpr (std::is_enum_v<T>) {
        encodeValue(encoder, static_cast<std::underlying_type_t<T>>(value));
    } else if constexpr (std::unsigned_integral<T>) {
        encoder.unsignedInteger(value);
    } else if constexpr (std::integral<T>) {
        encoder.integer(value);
    } else if constexpr (std::same_as<T, float>) {
        encoder.real(value);
    } else if constexpr (std::floating_point<T>) {
        encoder.real(static_cast<double>(value));
    } else if constexpr (TextArray<T> || Text<T>) {
        if constexpr (std::is_pointer_v<T>) {
            if (!value) return encoder.null();
        }
        encodeText(encoder, value);
    } else if constexpr (isSystemTime<T>) {
        encodeMilliseconds(encoder, value.time_since_epoch());
    } else if constexpr (isDuration<T>) {
        encodeMilliseconds(encoder, value);
    } else if constexpr (isOptional<T>) {
        if (value) {
            encodeValue(encoder, *value);
        } else {
            encoder.null();
        }
    } else if constexpr (StringMap<T>) {
        encoder.beginObject();
        for (const auto& [key, member] : value) {
            encoder.key(key);
            encodeValue(encoder, member);
        }
        encoder.endObject();
    } else if constexpr (std::ranges::range<const T>) {
        encoder.beginArray();
        for (const auto& element : value) {
            encodeValue<std::ranges::range_value_t<T>>(encoder, element);
        }
        encoder.endArray();
    } else {
        encodeRecord(encoder, value);
    }
}

struct FieldEncoder {
    template <class T>
    void operator()(std::string_view name, const T& field) const {
        if constexpr (isOptional<T>) {
            if (field) (*this)(name, *field);
        } else {
            encoder.key(name);
            encodeValue(encoder, field);
        }
    }
    Encoder& encoder;
};

template <class T>
void encodeRecord(Encoder& encoder, const T& value) {
    encoder.beginObject();
    forEachField(value, FieldEncoder{encoder});
    encoder.endObject();
}

}  // namespace detail

/// Writes `value` as one JSON value. Throws `EncodingError`, and whatever a type that encodes itself throws.
template <class T>
void encode(Encoder& encoder, const T& value) {
    if constexpr (detail::check(detail::searchValue<detail::Use::now, T, detail::noName, T>())) {
        detail::encodeValue(encoder, value);
    }
}

/// `value` as a JSON value.
template <class T>
[[nodiscard]] JSON encoded(const T& value) {
    Encoder encoder;
    encode(encoder, value);
    return std::move(encoder).takeJSON();
}

}  // namespace corvane

#pragma GCC visibility pop
