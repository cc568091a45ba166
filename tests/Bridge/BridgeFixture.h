#pragma once

#include <corvane/Bridge/CV.h>
#include <corvane/Testing/RecordingProcessor.h>

#include "tests/support/Testing.h"

namespace corvane::test {

/// An event class whose properties are given, and which counts how often it is asked for them.
struct CountingEvent final : CVEventType {
    CountingEvent(std::vector<CVEventProperty> given, std::shared_ptr<int> count)
        : properties(std::move(given)), asked(std::move(count)) {}
    std::vector<CVEventProperty> eventProperties() const override { return ++*asked, properties; }

    const std::vector<CVEventProperty> properties;
    const std::shared_ptr<int> asked;
};

inline CVEventClass eventClass(std::string name, std::vector<CVEventProperty> properties,
                               std::shared_ptr<int> asked = std::make_shared<int>(0)) {
    return {std::move(name), [properties = std::move(properties), asked = std::move(asked)] {
                return std::make_shared<CountingEvent>(properties, asked);
            }};
}

inline std::shared_ptr<CVRawDataEvent> raw(std::string name, CVDictionary dictionary) {
    return std::make_shared<CVRawDataEvent>(std::move(name), std::move(dictionary));
}

/// "domain code: message".
inline std::string describe(const CVError& error) {
    return error.domain() + " " + std::to_string(error.code()) + ": " + error.what();
}

/// A bridged session manager with a recording processor and a running session.
class BridgeTest : public ::testing::Test {
  protected:
    static constexpr auto required = CVEventPropertyRequirement::required;
    static constexpr auto optional = CVEventPropertyRequirement::optional;

    BridgeTest() {
        sessions->sessionManager()->processorManager()->add(processor);
        sessions->startSessionForKind(CVSessionKind::userEvents);
    }

    /// Where a completion leaves its outcome: the event's JSON text, or the error after "! ".
    CVSubmitCompletion keep(std::string& outcome) {
        return [&outcome](const CVProcessEvent* event, const CVError* error) {
            EXPECT_NE(event != nullptr, error != nullptr);
            outcome = event ? event->json().text() : "! " + describe(*error);
        };
    }
    std::string submit(const std::shared_ptr<CVTracker>& tracker, const CVEventClass& event) {
        std::string outcome = "(no completion)";
        tracker->submitEventType(event, false, keep(outcome));
        processor->settle();
        return outcome;
    }
    std::string submit(const std::shared_ptr<CVTracker>& tracker, const CVRawEvent& event) {
        std::string outcome = "(no completion)";
        tracker->submitRawEvent(event, false, keep(outcome));
        processor->settle();
        return outcome;
    }

    std::shared_ptr<RecordingProcessor> processor = std::make_shared<RecordingProcessor>();
    std::unique_ptr<CVSessionManager> sessions = std::make_unique<CVSessionManager>();
    std::shared_ptr<CVTracker> root = sessions->tracker();
};

}  // namespace corvane::test
