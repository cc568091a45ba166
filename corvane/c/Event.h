#pragma once

// Internal.

#include <corvane/Bridge/Data/BridgedRawEvent.h>
#include <corvane/Platform/Mutex.h>
#include <corvane/c/Objects.h>

#include <memory>
#include <optional>
#include <string>

namespace corvane::c {

/// An event that the host declares, until it is used for the first time.
class Event final : public Object {
  public:
    static constexpr Kind kind = Kind::event;

    explicit Event(std::string name) : name_(std::move(name)) {}

    /// Throws for a second property of one name, and for an event that was used.
    void add(std::string property, std::string data, BridgedEventPropertyRequirement requirement);
    /// The event as trackers take it.
    [[nodiscard]] BridgedRawEvent use();

  private:
    const std::string name_;
    Mutex mutex_;
    BridgedRawEvent::Properties properties_ CORVANE_GUARDED_BY(mutex_);
    std::optional<BridgedRawEvent> event_ CORVANE_GUARDED_BY(mutex_);
};

}  // namespace corvane::c
