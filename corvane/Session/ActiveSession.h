#pragma once

#include <corvane/Models/ProcessEvent.h>
#include <corvane/Models/Session.h>
#include <corvane/Tracker/ActiveSessionType.h>

#include <cstddef>
#include <cstdint>
#include <deque>
#include <optional>
#include <string>
#include <vector>

namespace corvane {

/// The session that runs, with the latest events handed over while it was active. Made by the session manager only, and
/// used on its queue.
class ActiveSession final : public ActiveSessionType {
  public:
    ActiveSession(std::string identifier, Session::Kind kind, Date startDate);
    ActiveSession(const ActiveSession&) = delete;
    ActiveSession& operator=(const ActiveSession&) = delete;
    ~ActiveSession() override;

    [[nodiscard]] const std::string& identifier() const override { return identifier_; }
    [[nodiscard]] const Session::Kind& kind() const override { return kind_; }
    [[nodiscard]] Date startDate() const override { return startDate_; }
    /// How many events are kept: a session may run for weeks.
    static constexpr std::size_t keptEvents = 10'000;

    /// The latest ones, in hand-over order.
    [[nodiscard]] std::vector<ProcessEvent> events() const;
    /// How many there were, those included that are not kept any more.
    [[nodiscard]] std::uint64_t eventCount() const { return eventCount_; }

    /// Keeps an event, in place of the oldest one when there are too many.
    void append(const ProcessEvent& event);

  private:
    /// Text of its own: what somebody's look into an event's JSON makes does not stay with the session.
    struct KeptEvent {
        std::string name;
        std::string json;
        std::optional<std::string> groupName;
    };

    const std::string identifier_;
    const Session::Kind kind_;
    const Date startDate_;
    std::deque<KeptEvent> events_;
    std::uint64_t eventCount_ = 0;
};

}  // namespace corvane
