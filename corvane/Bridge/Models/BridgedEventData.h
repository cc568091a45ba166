#pragma once

#include <corvane/Bridge/Data/BridgedDataEventClass.h>
#include <corvane/Bridge/Models/BridgedDataEventType.h>
#include <corvane/Export.h>
#include <corvane/Models/EventData.h>

#include <cstdint>
#include <string>

namespace corvane {

/// The span of a timed event, as an object. Callers see it as `CVTimedData`. Immutable.
///
/// An event class that requires `BridgedTimedData::dataClass()` gets the span that the event's timer has measured.
class CORVANE_EXPORT BridgedTimedData final : public BridgedDataEventType {
  public:
    explicit BridgedTimedData(TimedData timedData);
    BridgedTimedData(const BridgedTimedData&) = default;
    ~BridgedTimedData() override;

    /// The class, named "TimedData".
    [[nodiscard]] static BridgedDataEventClass dataClass();

    [[nodiscard]] Date startDate() const { return timedData_.startTimestamp; }
    [[nodiscard]] Date endDate() const { return timedData_.endTimestamp; }
    /// Milliseconds; negative when the end lies before the start.
    [[nodiscard]] std::int64_t duration() const { return timedData_.duration; }

    [[nodiscard]] std::string dataName() const override;
    /// With the keys that the tracker's own record has in an event.
    [[nodiscard]] HostValue::Dictionary toDict() const override;

  private:
    const TimedData timedData_;
};

/// What identifies an event, as an object. Callers see it as `CVEventData`. Immutable.
///
/// An event class that requires `BridgedEventData::dataClass()` gets the record that the tracker makes for the event.
class CORVANE_EXPORT BridgedEventData final : public BridgedDataEventType {
  public:
    explicit BridgedEventData(EventData eventData);
    BridgedEventData(const BridgedEventData&) = default;
    ~BridgedEventData() override;

    /// The class, named "EventData".
    [[nodiscard]] static BridgedDataEventClass dataClass();

    [[nodiscard]] const std::string& eventID() const { return eventData_.eventID; }
    [[nodiscard]] Date eventDate() const { return eventData_.eventTimestamp; }
    [[nodiscard]] const std::string& eventPath() const { return eventData_.eventPath; }
    [[nodiscard]] const std::string& sessionID() const { return eventData_.sessionID; }

    [[nodiscard]] std::string dataName() const override;
    /// With the keys that the tracker's own record has in an event.
    [[nodiscard]] HostValue::Dictionary toDict() const override;

  private:
    const EventData eventData_;
};

}  // namespace corvane
