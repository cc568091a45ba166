#pragma once

#include <corvane/Bridge/Data/BridgedDataEventClass.h>
#include <corvane/Bridge/Models/BridgedDataEventType.h>
#include <corvane/Export.h>
#include <corvane/Models/TimedData.h>

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

}  // namespace corvane
