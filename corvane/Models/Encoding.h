#pragma once

#include <corvane/Models/Encoder.h>
#include <corvane/Models/Fields.h>

#include <chrono>
#include <concepts>
#include <optional>
#include <ranges>
#include <ratio>
#include <string>
#include <string_view>
#include <type_traits>

// How values of host types become JSON. Integers of every width, floating point and booleans become numbers; text
// becomes a string; a `std::chrono::system_clock` time point becomes whole milliseconds since 1970; an optional is its
// value, left out of its record when it has none (null inside an array); vectors and other ranges become arrays;
// string-keyed maps and records become objects; an enumeration becomes its integer, or text where the host supplies
// `std::string_view toText(Enum)` beside it; `JSON` is taken as it is. A type may encode itself with
// `void encode(corvane::Encoder&) const`.

namespace corvane {

namespace detail {

template <class T>
inline constexpr bool isOptional = false;
template <class T>
inline constexpr bool isOptional<std::optional<T>> = true;

template <class T>
inline constexpr bool isSystemTime = false;
template <class D>
inline constexpr bool isSystemTime<std::chrono::time_point<std::chrono::system_clock, D>> = true;

template <class T>
concept EncodesItself = requires(const T& value, Encoder& encoder) {
    value.encode(encoder);
};

template <class T>
concept TextEnumeration = std::is_enum_v<T> && requires(T value) {
    { toText(value) } -> std::convertible_to<std::string_view>;
};

template <class T>
concept StringMap = std::ranges::range<const T> && requires {
    typename T::key_type;
    typename T::mapped_type;
} && std::convertible_to<const typename T::key_type&, std::string_view>;

template <class T>
void encodeRecord(Encoder& encoder, const T& value);

/// Coarse and floating-point clocks reach further than milliseconds do.
template <class D>
void encodeDate(Encoder& encoder, D sinceEpoch) {
    if constexpr (std::integral<typename D::rep> && std::ratio_less_equal_v<typename D::period, std::milli>) {
        encoder.integer(std::chrono::duration_cast<std::chrono::milliseconds>(sinceEpoch).count());
    } else {
        encoder.date(std::chrono::duration<long double, std::milli>(sinceEpoch).count());
    }
}

}  // namespace detail

/// Writes `value` as one JSON value. Throws `EncodingError`, and whatever a type that encodes itself throws.
template <class T>
void encode(Encoder& encoder, const T& value) {
    if constexpr (detail::EncodesItself<T>) {
        value.encode(encoder);
    } else if constexpr (std::same_as<T, JSON>) {
        encoder.json(value);
    } else if constexpr (std::same_as<T, bool>) {
        encoder.boolean(value);
    } else if constexpr (detail::TextEnumeration<T>) {
        encoder.string(toText(value));
    } else if constexpr (std::is_enum_v<T>) {
        encode(encoder, static_cast<std::underlying_type_t<T>>(value));
    } else if constexpr (std::unsigned_integral<T>) {
        encoder.unsignedInteger(value);
    } else if constexpr (std::integral<T>) {
        encoder.integer(value);
    } else if constexpr (std::same_as<T, float>) {
        encoder.real(value);
    } else if constexpr (std::floating_point<T>) {
        encoder.real(static_cast<double>(value));
    } else if constexpr (std::convertible_to<const T&, std::string_view>) {
        if constexpr (std::is_pointer_v<T>) {
            if (!value) return encoder.null();
        }
        encoder.string(value);
    } else if constexpr (detail::isSystemTime<T>) {
        detail::encodeDate(encoder, value.time_since_epoch());
    } else if constexpr (detail::isOptional<T>) {
        if (value) {
            encode(encoder, *value);
        } else {
            encoder.null();
        }
    } else if constexpr (detail::StringMap<T>) {
        encoder.beginObject();
        for (const auto& [key, member] : value) {
            encoder.key(key);
            encode(encoder, member);
        }
        encoder.endObject();
    } else if constexpr (std::ranges::range<const T>) {
        encoder.beginArray();
        for (const auto& element : value) {
            encode<std::ranges::range_value_t<T>>(encoder, element);
        }
        encoder.endArray();
    } else if constexpr (Record<T>) {
        detail::encodeRecord(encoder, value);
    } else {
        static_assert(Record<T>,
                      "corvane cannot encode this type: it is neither a value that JSON knows nor a plain aggregate of "
                      "up to 64 such fields; spell its fields once in corvaneFields(), or give it encode(Encoder&)");
    }
}

namespace detail {

struct FieldEncoder {
    template <class T>
    void operator()(std::string_view name, const T& field) const {
        if constexpr (isOptional<T>) {
            if (field) (*this)(name, *field);
        } else {
            encoder.key(name);
            encode(encoder, field);
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

/// `value` as a JSON value.
template <class T>
[[nodiscard]] JSON encoded(const T& value) {
    Encoder encoder;
    encode(encoder, value);
    return JSON::fromEncodedText(std::move(encoder).take());
}

}  // namespace corvane
