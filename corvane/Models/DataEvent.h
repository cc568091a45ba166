#pragma once

#include <corvane/Export.h>
#include <corvane/Models/DataEventError.h>
#include <corvane/Models/Encoding.h>
#include <corvane/Reflection/DataType.h>

#include <atomic>
#include <concepts>
#include <mutex>
#include <optional>
#include <utility>

namespace corvane {

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
    [[nodiscard]] JSON toDict() const;

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
        mutable std::mutex mutex;
        mutable std::optional<JSON> dict;             // written once, under the mutex
        mutable std::atomic<bool> isEncoded = false;  // `dict` is there, and does not change any more
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
