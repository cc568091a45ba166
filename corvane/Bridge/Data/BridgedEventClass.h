#pragma once

#include <corvane/Bridge/Data/BridgedDataEventClass.h>
#include <corvane/Export.h>
#include <corvane/Models/EventProperty.h>

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace corvane {

/// Whether an event can do without a property: 0 is `required`, 1 is `optional`. Callers see it as
/// `CVEventPropertyRequirement`, and may hand over any integer: one that is not a value here fails the events that
/// declare it. The library's own enumeration, whose values are the ones that were published.
using BridgedEventPropertyRequirement = EventPropertyRequirement;

static_assert(static_cast<int>(BridgedEventPropertyRequirement::required) == 0 &&
              static_cast<int>(BridgedEventPropertyRequirement::optional) == 1);

/// A property that an event class declares. Callers see it as `CVEventProperty`. A value.
class BridgedEventProperty {
  public:
    /// @param name the property's name in the event's JSON; without one it is called like its data
    BridgedEventProperty(BridgedDataEventClass dataType, BridgedEventPropertyRequirement requirement,
                         std::optional<std::string> name = std::nullopt)
        : dataType_(std::move(dataType)), requirement_(requirement), name_(std::move(name)) {}

    [[nodiscard]] const BridgedDataEventClass& dataType() const { return dataType_; }
    [[nodiscard]] BridgedEventPropertyRequirement requirement() const { return requirement_; }
    /// The key under which the data is looked up: the name of its class.
    [[nodiscard]] const std::string& dataKey() const { return dataType_.dataName(); }
    [[nodiscard]] const std::string& name() const { return name_ ? *name_ : dataKey(); }

  private:
    BridgedDataEventClass dataType_;
    BridgedEventPropertyRequirement requirement_;
    std::optional<std::string> name_;
};

/// An instance of an event class that is made at run time. Callers see it as `CVEventType`. Made by its
/// `BridgedEventClass` on the tracker's queue, asked once, and released.
class CORVANE_EXPORT BridgedEventType {
  public:
    virtual ~BridgedEventType() = default;

    /// The properties in the order in which they stand in the event's JSON. What it throws fails the submission, and
    /// the next one asks again.
    [[nodiscard]] virtual std::vector<BridgedEventProperty> eventProperties() const = 0;
};

/// A class of events as an object: what is submitted and timed. Callers see it as `CVEventClass`. A value whose copies
/// share the class.
///
///     const CVEventClass screenView{"ScreenView", [] { return std::make_shared<ScreenView>(); }};
///
/// Each tracker asks a class for its properties once per event name: of two classes of one name, the first one
/// submitted on a tracker defines it there.
class CORVANE_EXPORT BridgedEventClass {
  public:
    using Init = std::function<std::shared_ptr<BridgedEventType>()>;

    /// @param init makes an instance; called on the tracker's queue. What it throws, and an instance that is nullptr,
    ///     fails the submission.
    BridgedEventClass(std::string eventName, Init init);

    [[nodiscard]] const std::string& eventName() const { return content_->eventName; }

    /// The properties that a new instance declares. Throws `BridgeError::missingObject` without an instance, and what
    /// the host's code throws.
    [[nodiscard]] std::vector<BridgedEventProperty> eventProperties() const;

  private:
    struct Content {
        std::string eventName;
        Init init;
    };
    std::shared_ptr<const Content> content_;
};

}  // namespace corvane
