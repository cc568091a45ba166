#pragma once

#include <corvane/Export.h>
#include <corvane/Models/AnyDataEventEntry.h>
#include <corvane/Models/EventSubmit.h>

#include <string>
#include <utility>
#include <vector>

namespace corvane {

/// Which entries a snapshot copies.
enum class SnapshotPolicy {
    now,  ///< of each key the entry in scope: the newest one of the nearest tracker
    all,  ///< every entry of every stack; an evaluation then takes the oldest one of the nearest tracker
};

/// A property with the entry that answers it.
struct SnapshotEntry {
    std::string name;
    AnyDataEventEntry dataEntry;
};

/// An event type evaluated against a snapshot: what it would carry, and what it lacks. A value.
struct SnapshotEvent {
    /// A property without data.
    class MissingData {
      public:
        [[nodiscard]] static MissingData required(std::string key, DataType type) {
            return {false, std::move(key), type};
        }
        [[nodiscard]] static MissingData optional(std::string key, DataType type) {
            return {true, std::move(key), type};
        }

        [[nodiscard]] bool isOptional() const { return isOptional_; }
        /// The property's name.
        [[nodiscard]] const std::string& key() const { return key_; }
        /// The data type that it asks for.
        [[nodiscard]] DataType type() const { return type_; }
        friend bool operator==(const MissingData&, const MissingData&) = default;

      private:
        MissingData(bool isOptional, std::string key, DataType type)
            : isOptional_(isOptional), key_(std::move(key)), type_(type) {}
        bool isOptional_;
        std::string key_;
        DataType type_;
    };

    bool isValid = true;                   ///< nothing that is required is missing
    std::vector<SnapshotEntry> entries;    ///< in declaration order
    std::vector<MissingData> missingData;  ///< in declaration order

    /// Keeps the names in `entries` alive.
    EventMirrorProperties properties;
};

/// The data in scope of a tracker at one moment. Immutable; it keeps no tracker alive, and may be read from any thread.
///
///     const SnapshotEvent view = tracker->snapshot(SnapshotPolicy::now)->evaluate<ScreenView>();
///     for (const auto& missing : view.missingData) {
///         if (missing.isOptional() || missing.type() == DataType::of<EventData>()) continue;
///         ...    // a submission would fail: nothing was pushed for missing.key()
///     }
class CORVANE_EXPORT SnapshotType {
  public:
    virtual ~SnapshotType() = default;

    /// Checks an event type against the copied data. Consumes nothing; runs on the caller's thread. A required
    /// `TimedData` is answered by the timer that ran on the nearest tracker, up to now, in an entry that names no place
    /// of the host's. `EventData` is made with an event, and none has been made: an event type that requires it is
    /// never valid here, and has it among what is missing.
    template <class E>
    [[nodiscard]] CORVANE_LOCAL SnapshotEvent evaluate() const {
        return evaluate(EventSubmit::actual<E>());
    }
    [[nodiscard]] virtual SnapshotEvent evaluate(const EventSubmit& event) const = 0;

  protected:
    SnapshotType() = default;
    SnapshotType(const SnapshotType&) = default;
    SnapshotType& operator=(const SnapshotType&) = default;
};

}  // namespace corvane
