#pragma once

#include <corvane/corvane.h>

#include <chrono>
#include <future>
#include <memory>
#include <optional>
#include <string>
#include <thread>

namespace corvane::bench {

// An event of about 300 bytes with three objects.
struct Screen {
    std::string name;
    int depth = 0;
};
struct Viewer {
    std::string id;
    std::optional<std::string> plan;
};
struct ScreenView {
    EventProperty<EventData> event = required;
    EventProperty<Screen> screen = required;
    EventProperty<Viewer> viewer = optional;
};
inline const Screen home{"home/recommended/for-you", 3};
inline const Viewer viewer{"9f1c2a7e-viewer-0042", "premium-family"};

/// A processor that does nothing.
class NullProcessor final : public EventProcessorType {
  public:
    void registerAccessQueue(std::shared_ptr<SerialQueue>) override {}
    void process(const ProcessEvent&) override {}
};

/// A host with a session and data in scope.
class Host {
  public:
    explicit Host(std::shared_ptr<EventProcessorType> processor = std::make_shared<NullProcessor>()) {
        if (processor) sessions.processorManager()->add(std::move(processor));
        sessions.start(Session::Kind::userEvents());
        tracker = sessions.tracker()->chain("player");
        tracker->push(home);
        tracker->push(viewer);
        drain();
        released_.manager = sessions.processorManager();
    }

    /// Waits until the queue has run everything enqueued before.
    void drain() {
        std::promise<void> reached;
        tracker->transaction([&](AccessTracker&) { reached.set_value(); });
        reached.get_future().wait();
    }

    /// Lets the session's events go.
    void renewSession() {
        sessions.end();
        sessions.start(Session::Kind::userEvents());
        drain();
    }

    /// Runs `work` on the queue, so that nothing but the pipeline is measured.
    template <class Work>
    void onQueue(Work work) {
        std::promise<void> done;
        tracker->transaction([&](AccessTracker& access) {
            work(access);
            done.set_value();
        });
        done.get_future().wait();
    }

    /// The finished JSON text of one event.
    std::string eventText() {
        std::promise<std::string> text;
        tracker->submit<ScreenView>(
            [&](const EventSubmitResult& result) { text.set_value(result.event()->json().text()); });
        return text.get_future().get();
    }

  private:
    /// Outlives the rest, and waits until the queue has let everything go, so that it is not measured with the next.
    struct Released {
        ~Released() {
            while (!manager.expired()) std::this_thread::sleep_for(std::chrono::milliseconds(1));
        }
        std::weak_ptr<const void> manager;
    } released_;

  public:
    SessionManager sessions;
    std::shared_ptr<Tracker> tracker;
};

}  // namespace corvane::bench
