#pragma once

#include <corvane/Bridge/Models/BridgedDataEventType.h>
#include <corvane/Models/DataEvent.h>

#include <memory>

namespace corvane {

/// An object-facing data event as one of the library's. A value; the object is shared.
///
/// It only ever becomes JSON through the object's own dictionary: `encode` and `decode` throw
/// `DataEventError::internalError`.
class BridgedDataEvent {
  public:
    /// Throws `InvalidArgument` without an object.
    explicit BridgedDataEvent(std::shared_ptr<const BridgedDataEventType> object);

    [[nodiscard]] const std::shared_ptr<const BridgedDataEventType>& object() const { return object_; }

    /// The object's dictionary, converted. Throws what `toJsonValue` does, but
    /// `DataEventError::dataNotSerializable` for a value of the dictionary itself, and what the object throws.
    [[nodiscard]] JSON toDict() const;
    static constexpr bool isEncodedByLibrary = true;

    [[noreturn]] void encode(Encoder& encoder) const;
    [[noreturn]] static BridgedDataEvent decode(const JSON& json);

  private:
    std::shared_ptr<const BridgedDataEventType> object_;
};

}  // namespace corvane
