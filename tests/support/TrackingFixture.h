#pragma once

#include <corvane/Models/EventData.h>
#include <corvane/Session/SessionManager.h>
#include <corvane/Testing/RecordingProcessor.h>
#include <corvane/Tracker/AccessTracker.h>

#include "tests/support/Testing.h"

namespace corvane::test {

struct Screen {
    std::string name;
};
struct Viewer {
    std::string id;
    std::optional<std::string> plan;
};

struct ScreenView {
    EventProperty<Screen> screen = required;
    EventProperty<Viewer> viewer = EventProperty<Viewer>::optional;
};
struct Identified {
    EventProperty<EventData> event = required;
};
struct Played {
    EventProperty<TimedData> span = required;
};

/// A session manager with a recording processor and, unless a test says otherwise, a running session.
class TrackingTest : public ::testing::Test {
  protected:
    TrackingTest() {
        sessions->processorManager()->add(processor);
        sessions->start(Session::Kind::userEvents());
    }

    /// Submits and returns the outcome: the event's JSON text, or the error's message after "! ".
    template <class E>
    std::string submit(const std::shared_ptr<Tracker>& tracker) {
        std::string outcome = "(no completion)";
        tracker->submit<E>([&](const EventSubmitResult& result) {
            outcome = result.succeeded() ? result.event()->json().text() : "! " + std::string(result.error()->what());
        });
        processor->settle();
        return outcome;
    }

    std::shared_ptr<RecordingProcessor> processor = std::make_shared<RecordingProcessor>();
    std::unique_ptr<SessionManager> sessions = std::make_unique<SessionManager>();
    std::shared_ptr<Tracker> root = sessions->tracker();
};

}  // namespace corvane::test
