#pragma once

#include <corvane/Bridge/Data/BridgedEventType.h>
#include <corvane/Export.h>

#include <functional>
#include <memory>
#include <string>

namespace corvane {

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
