#pragma once

#include <corvane/Models/ProcessEvent.h>

#include <optional>
#include <string>
#include <utility>

namespace corvane {

/// A submitted event as processors and completions see it. Callers see it as `CVProcessEvent`. A value whose copies
/// share the JSON; may be read from any thread.
class BridgedProcessEvent {
  public:
    explicit BridgedProcessEvent(ProcessEvent processEvent) : processEvent_(std::move(processEvent)) {}

    [[nodiscard]] const std::string& name() const { return processEvent_.name(); }
    /// The format version of events.
    [[nodiscard]] std::string version() const { return std::string(ProcessEvent::version()); }
    [[nodiscard]] const JSON& json() const { return processEvent_.json(); }
    /// The innermost group the submitting tracker was in, or nothing.
    [[nodiscard]] const std::optional<std::string>& groupName() const { return processEvent_.groupName(); }

    /// The library's own event.
    [[nodiscard]] const ProcessEvent& processEvent() const { return processEvent_; }

  private:
    ProcessEvent processEvent_;
};

}  // namespace corvane
