#pragma once

#include <corvane/Export.h>
#include <corvane/Models/Encoding.h>

#include <cmath>
#include <limits>
#include <string>
#include <string_view>
#include <utility>

// The way back from JSON to host types: the counterpart of Encoding.h, for stored documents, tests and hosts that read
// what they sent. A type may decode itself with `static T decode(const corvane::JSON&)`. Enumerations with text come
// back through `bool fromText(std::string_view, Enum&)` beside them.

namespace corvane {

/// JSON that does not hold what a type needs. The message names the property. Domain "Corvane.DecodingError".
class CORVANE_EXPORT DecodingError : public Error {
  public:
    enum Code {
        missing = 0,  ///< a field that is not optional is not there
        wrongType,    ///< the value is of another kind
        outOfRange,   ///< the number or date does not fit the field
    };
    DecodingError(Code code, std::string path);
    DecodingError(const DecodingError&) = default;
    DecodingError& operator=(const DecodingError&) = default;
    ~DecodingError() override;

    [[nodiscard]] Code value() const noexcept { return static_cast<Code>(code()); }
    /// Which value: "viewer.age"; empty for the value itself.
    [[nodiscard]] const std::string& path() const noexcept { return path_; }

  private:
    std::string path_;
};

template <class T>
[[nodiscard]] CORVANE_LOCAL T decode(const JSON& json);

#pragma GCC visibility push(hidden)
namespace detail {

template <class T>
T require(std::optional<T> value) {
    if (!value) throw DecodingError(DecodingError::wrongType, {});
    return *std::move(value);
}

/// Decodes a part, putting its name before the path of an error.
template <class T>
T decodePart(std::string_view name, const JSON& json) {
    try {
        return decode<T>(json);
    } catch (const DecodingError& error) {
        throw DecodingError(error.value(), std::string(name) + (error.path().empty() ? "" : "." + error.path()));
    }
}

template <class T, class Integer>
T narrow(Integer number) {
    if (!std::in_range<T>(number)) throw DecodingError(DecodingError::outOfRange, {});
    return static_cast<T>(number);
}

template <class T>
T decodeInteger(const JSON& json) {
    if constexpr (std::unsigned_integral<T>) {
        if (auto number = json.unsignedInteger()) return narrow<T>(*number);
    }
    return narrow<T>(require(json.integer()));
}

template <class T>
T decodeReal(const JSON& json) {
    const auto number = json.double_();
    const auto real = static_cast<T>(number ? *number : static_cast<double>(require(json.integer())));
    if (!std::isfinite(real)) throw DecodingError(DecodingError::outOfRange, {});  // of a float
    return real;
}

template <class T>
T decodeDate(const JSON& json) {
    const auto date = dateFromMilliseconds(require(json.integer()));
    if (!date) throw DecodingError(DecodingError::outOfRange, {});
    return std::chrono::time_point_cast<typename T::duration>(*date);
}

template <class T>
T decodeDuration(const JSON& json) {
    using Milliseconds = std::chrono::duration<long double, std::milli>;
    const std::chrono::milliseconds duration(require(json.integer()));
    if (Milliseconds(duration) < Milliseconds(T::min()) || Milliseconds(duration) > Milliseconds(T::max())) {
        throw DecodingError(DecodingError::outOfRange, {});
    }
    return std::chrono::duration_cast<T>(duration);
}

template <class T>
T decodeMap(const JSON& json) {
    T map;
    for (auto& [key, member] : require(json.object())) {
        map.emplace(key, decodePart<typename T::mapped_type>(key, member));
    }
    return map;
}

template <class T>
T decodeArray(const JSON& json) {
    T elements;
    for (auto& element : require(json.array())) {
        elements.insert(elements.end(), decodePart<std::ranges::range_value_t<T>>("[]", element));
    }
    return elements;
}

struct FieldDecoder {
    template <class T>
    void operator()(std::string_view name, T& field) const {
        const JSON member = json[name];
        if (!member.exists()) {
            if constexpr (isOptional<T>) {
                field.reset();
                return;
            } else {
                throw DecodingError(DecodingError::missing, std::string(name));
            }
        }
        field = decodePart<T>(name, member);
    }
    const JSON& json;
};

template <class T>
T decodeRecord(const JSON& json) {
    if (!json.isObject()) throw DecodingError(DecodingError::wrongType, {});
    T record{};
    forEachField(record, FieldDecoder{json});
    return record;
}

}  // namespace detail
#pragma GCC visibility pop

/// Makes a `T` from the JSON that encoding one gives. Throws `DecodingError`.
template <class T>
CORVANE_LOCAL T decode(const JSON& json) {
    if constexpr (requires {
                      { T::decode(json) } -> std::same_as<T>;
                  }) {
        return T::decode(json);
    } else if constexpr (std::same_as<T, JSON>) {
        return json;
    } else if constexpr (std::same_as<T, bool>) {
        return detail::require(json.bool_());
    } else if constexpr (detail::TextEnumeration<T>) {
        T value{};
        if (!fromText(detail::require(json.string()), value)) throw DecodingError(DecodingError::outOfRange, {});
        return value;
    } else if constexpr (std::is_enum_v<T>) {
        return static_cast<T>(decode<std::underlying_type_t<T>>(json));
    } else if constexpr (std::integral<T>) {
        return detail::decodeInteger<T>(json);
    } else if constexpr (std::floating_point<T>) {
        return detail::decodeReal<T>(json);
    } else if constexpr (std::same_as<T, std::string>) {
        return detail::require(json.string());
    } else if constexpr (std::same_as<T, std::u8string>) {
        const std::string text = detail::require(json.string());
        return {text.begin(), text.end()};
    } else if constexpr (detail::isSystemTime<T>) {
        return detail::decodeDate<T>(json);
    } else if constexpr (detail::isDuration<T>) {
        return detail::decodeDuration<T>(json);
    } else if constexpr (detail::isOptional<T>) {
        if (!json.exists() || json.isNull()) return std::nullopt;
        return decode<typename T::value_type>(json);
    } else if constexpr (detail::StringMap<T>) {
        return detail::decodeMap<T>(json);
    } else if constexpr (std::ranges::range<T>) {
        return detail::decodeArray<T>(json);
    } else {
        static_assert(Record<T>, "corvane cannot decode this type: see Encoding.h for the types that it knows");
        return detail::decodeRecord<T>(json);
    }
}

}  // namespace corvane
