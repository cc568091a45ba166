#pragma once

#include <corvane/Export.h>
#include <corvane/Models/Encoding.h>
#include <corvane/Platform/Error.h>
#include <corvane/Reflection/DataType.h>

#include <atomic>
#include <concepts>
#include <utility>

namespace corvane {

/// A data event that cannot become a JSON object. Domain "Corvane.DataEventError".
class CORVANE_EXPORT DataEventError : public Error {
  public:
    enum Code {
        invalidTopLevelJson = 0,        ///< its encoding is not an object
        internalError,                  ///< an object-facing data event was put through the structured encoder
        dataNotSerializable,            ///< a value in an object-facing data event's dictionary cannot be converted
        dataArrayValueNotSerializable,  ///< an element of an array cannot be converted
        dataDictKeyNotSerializable,     ///< a key of a dictionary is not a string
        dataDictValueNotSerializable,   ///< a value of a dictionary cannot be converted
    };
    explicit DataEventError(Code code);
    DataEventError(const DataEventError&) = default;
    DataEventError& operator=(const DataEventError&) = default;
    ~DataEventError() override;

    [[nodiscard]] Code value() const noexcept { return static_cast<Code>(code()); }
    friend bool operator==(const DataEventError& a, const DataEventError& b) noexcept { return a.code() == b.code(); }
};

/// A typed piece of context data: a plain aggregate, a record with a descriptor, or a type that encodes itself. Every
/// field becomes a key of a JSON object, named exactly like the field.
template <class T>
concept DataEventType = std::is_class_v<T> && std::move_constructible<T> &&
    (detail::EncodesItself<T> || Record<T> || requires(const T& data) {
        { data.toDict() } -> std::same_as<JSON>;
    });

namespace detail {
/// The value unless it is not an object: then throws `invalidTopLevelJson`.
CORVANE_EXPORT JSON requireObject(JSON json);
/// The same for a value that the host made, which may also nest too deep.
CORVANE_EXPORT JSON requireHostObject(JSON json);

/// A type whose `toDict` gives what the library's own encoder wrote, which needs no second look.
template <class T>
concept EncodedByLibrary = requires {
    requires T::isEncodedByLibrary;
};

/// `toDict` of what has been found to be a data event that can be encoded.
template <class T>
CORVANE_LOCAL JSON dictOf(const T& data) {
    if constexpr (requires {
                      { data.toDict() } -> std::same_as<JSON>;
                  }) {
        return EncodedByLibrary<T> ? requireObject(data.toDict()) : requireHostObject(data.toDict());
    } else {
        Encoder encoder;
        encodeValue(encoder, data);
        return requireObject(std::move(encoder).takeJSON());
    }
}
}  // namespace detail

/// A data event as a JSON object: what its own `JSON toDict() const` returns where it has one, its encoded fields
/// otherwise. Throws `EncodingError`, `DataEventError::invalidTopLevelJson`, or what the data event itself throws.
template <DataEventType T>
[[nodiscard]] CORVANE_LOCAL JSON toDict(const T& data) {
    if constexpr (detail::check(detail::searchDataEvent<detail::Use::now, T>())) {
        return detail::dictOf(data);
    }
}

/// A data event of any type, held by reference. It is encoded when it is first asked for, and every event that finds it
/// on a stack reuses the text. Immutable; may be read from any thread.
class CORVANE_EXPORT AnyDataEvent {
  public:
    /// The data event is kept and encoded later: one that refers to what is somebody else's, such as a view, is refused
    /// by the compiler.
    template <class T>
    requires(!std::same_as<T, AnyDataEvent> && DataEventType<T>) CORVANE_LOCAL explicit AnyDataEvent(T data) {
        if constexpr (detail::check(detail::searchDataEvent<detail::Use::later, T>())) {
            box_ = new Box<T>(std::move(data));
        }
    }

    AnyDataEvent(const AnyDataEvent& other) noexcept : box_(other.box_) {
        if (box_) box_->references.fetch_add(1, std::memory_order_relaxed);
    }
    /// Leaves `other` good for nothing but destruction and assignment.
    AnyDataEvent(AnyDataEvent&& other) noexcept : box_(std::exchange(other.box_, nullptr)) {}
    AnyDataEvent& operator=(AnyDataEvent other) noexcept {
        std::swap(box_, other.box_);
        return *this;
    }
    ~AnyDataEvent() {
        if (box_ && box_->references.fetch_sub(1, std::memory_order_acq_rel) == 1) destroy(box_);
    }

    /// The data event as a JSON object. Throws as the free function `toDict` does, each time anew.
    [[nodiscard]] JSON toDict() const {
        return AnyDataEvent(*this).dict();
    }  // a copy: the host's code may replace this
    /// The same without a copy. Good as long as a copy of this object.
    /// Requires: the data event's own code does not change this object.
    [[nodiscard]] const JSON& dict() const;

    [[nodiscard]] DataType type() const { return box_->type(); }

    /// The data event as a `T`, or nullptr when it is of another type. Good as long as a copy of this object.
    template <class T>
    [[nodiscard]] CORVANE_LOCAL const T* as() const {
        return type() == DataType::of<T>() ? &static_cast<const Box<T>&>(*box_).data : nullptr;
    }

  private:
    struct CORVANE_EXPORT Base {
        virtual ~Base();
        [[nodiscard]] virtual DataType type() const = 0;
        [[nodiscard]] virtual JSON makeDict() const = 0;

        mutable std::atomic<std::size_t> references = 1;
        mutable std::atomic<const JSON*> dict = nullptr;  // its own; set once
    };
    static void destroy(const Base* box) noexcept;

    template <class T>
    struct CORVANE_LOCAL Box final : Base {
        explicit Box(T value) : data(std::move(value)) {}
        [[nodiscard]] DataType type() const override { return DataType::of<T>(); }
        [[nodiscard]] JSON makeDict() const override { return detail::dictOf(data); }
        const T data;
    };

    // Counted by itself: the standard library's shared pointers would make functions of the host's types that all
    // objects of the process share, where another one may have a type of the same name.
    const Base* box_ = nullptr;
};

}  // namespace corvane
