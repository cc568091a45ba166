#pragma once

// Internal.

#include <corvane/Bridge/Models/HostValue.h>
#include <corvane/Platform/Mutex.h>
#include <corvane/c/Objects.h>

#include <string>
#include <string_view>
#include <vector>

namespace corvane::c {

/// A dictionary or an array that the host builds.
class Value final : public Object {
  public:
    static constexpr Kind kind = Kind::value;

    explicit Value(bool isDictionary) : isDictionary_(isDictionary) {}
    explicit Value(const HostValue& value);

    /// Throw when the value is of the other kind.
    void set(std::string key, HostValue value);
    void add(HostValue element);

    /// What it holds now.
    [[nodiscard]] HostValue value() const;

  private:
    void require(bool isDictionary) const;

    const bool isDictionary_;
    mutable Mutex mutex_;
    HostValue::Array elements_ CORVANE_GUARDED_BY(mutex_);
    std::vector<HostValue::Entry> entries_ CORVANE_GUARDED_BY(mutex_);
};

/// The object or array in a JSON text. Throws when it is none.
[[nodiscard]] HostValue valueOf(std::string_view json);

/// A dictionary that can be pushed; throws for what becomes no JSON.
[[nodiscard]] HostValue::Dictionary dictionaryOf(const HostValue& value);
/// That of an object of the host's, and of a JSON text.
[[nodiscard]] HostValue::Dictionary dictionaryOf(const void* value);
[[nodiscard]] HostValue::Dictionary dictionaryOfJSON(const char* json);

/// The name of data that a host pushes: not one of the library's own records. Throws.
[[nodiscard]] std::string dataName(const char* given);

}  // namespace corvane::c
