#pragma once

// Internal: what the pointers of the C interface stand for.

#include <cstdint>
#include <memory>
#include <utility>

namespace corvane::c {

enum class Kind : std::uint8_t {
    sessions = 1,
    sessionAccess,
    tracker,
    access,
    event,
    value,
    delayed,
    observer,
    snapshot,
    evaluation,
    processor,
    text,
    task,
    headers,
};

/// What a pointer may stand for.
class Object {
  public:
    Object() = default;
    Object(const Object&) = delete;
    Object& operator=(const Object&) = delete;
    virtual ~Object() = default;
};

/// A pointer of the C interface is no address: it names a slot of a table, the kind of what is in it, and how often the
/// slot was used before. So a pointer that is null, was released, or is of another kind is told apart from a good one
/// without looking at memory that may be somebody else's. Slots are never given back to the system.
///
/// An object goes when it has no owner, which are the host's, and no call that uses it is under way. Any thread.
namespace objects {

/// A pointer with one owner. Throws `std::bad_alloc` when there are millions of objects.
[[nodiscard]] void* add(Kind kind, std::unique_ptr<Object> object);
/// The object, for a call; to be given back by `drop`. Throws what is wrong with the pointer.
/// @param what for the message: "the tracker"
[[nodiscard]] Object& use(const void* pointer, Kind kind);
void drop(const void* pointer) noexcept;
/// One owner more; false when there is no such object.
bool retain(const void* pointer) noexcept;
/// One owner less; false when there is none.
bool release(const void* pointer) noexcept;

}  // namespace objects

/// An object for the length of a call.
template <class T>
class Used {
  public:
    explicit Used(const void* pointer) : pointer_(pointer), object_(static_cast<T&>(objects::use(pointer, T::kind))) {}
    Used(const Used&) = delete;
    Used& operator=(const Used&) = delete;
    ~Used() { objects::drop(pointer_); }

    T* operator->() const { return &object_; }
    T& operator*() const { return object_; }

  private:
    const void* const pointer_;
    T& object_;
};

/// Makes an object, and the pointer for its owner.
template <class T, class... Arguments>
[[nodiscard]] void* make(Arguments&&... arguments) {
    return objects::add(T::kind, std::make_unique<T>(std::forward<Arguments>(arguments)...));
}

/// An object that a callback is lent.
template <class T>
class Lent {
  public:
    template <class... Arguments>
    explicit Lent(Arguments&&... arguments) : pointer_(make<T>(std::forward<Arguments>(arguments)...)) {}
    Lent(const Lent&) = delete;
    Lent& operator=(const Lent&) = delete;
    ~Lent() { objects::release(pointer_); }

    [[nodiscard]] void* pointer() const { return pointer_; }

  private:
    void* const pointer_;
};

}  // namespace corvane::c
