#pragma once

#include <corvane/Export.h>
#include <corvane/Tracker/SessionObserver.h>

#include <memory>

namespace corvane {

/// An observation of session changes. Callers see it as `CVSessionObserver`. Letting go of it ends nothing: the
/// observation lasts as long as the object that bounds it, at first the tracker that was asked.
class CORVANE_EXPORT BridgedSessionObserver {
  public:
    explicit BridgedSessionObserver(std::shared_ptr<SessionObserver> sessionObserver);
    ~BridgedSessionObserver();

    /// Bounds the observation by the life of another object, which is held weakly. Any thread.
    void disposeOnObject(const std::shared_ptr<const void>& object);

  private:
    const std::shared_ptr<SessionObserver> sessionObserver_;
};

}  // namespace corvane
