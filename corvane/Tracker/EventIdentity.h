#pragma once

#include <corvane/Platform/Date.h>

#include <string>
#include <string_view>

namespace corvane {

/// What the library itself says of the events of one tracker in one session: the text of an `EventData`, of which only
/// the identifier and the time change from event to event. Immutable.
class EventIdentity {
  public:
    EventIdentity(std::string_view eventPath, std::string_view sessionID);

    [[nodiscard]] const std::string& sessionID() const { return sessionID_; }
    /// At most so many bytes are appended.
    [[nodiscard]] std::size_t size() const { return rest_.size() + 90; }
    /// Appends the identity of a new event. Throws `EncodingError` when the path is not UTF-8.
    void append(std::string& out, Date submitTime) const;

  private:
    std::string sessionID_;
    std::string rest_;  // from the path on; empty when it cannot be written
};

}  // namespace corvane
