#pragma once

#include <corvane/Store/DeferredStoreCore.h>
#include <corvane/corvane.h>

#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <future>
#include <memory>
#include <string>
#include <utility>

namespace corvane::test {

using namespace std::chrono_literals;

struct Screen {
    std::string name;
};

struct ScreenView {
    EventProperty<EventData> event = required;
    EventProperty<Screen> screen = required;
};

/// Writes the identifier of an acknowledged event to standard output, as hosts in a process of their own do.
inline void acknowledge(const EventSubmitResult& result) {
    if (!result.succeeded()) return;
    const std::string line = *result.event()->json()["event"]["eventID"].string() + "\n";
    if (write(STDOUT_FILENO, line.data(), line.size()) < 0) std::_Exit(3);
}

/// An application as a host writes it, with the whole library behind it and an endpoint named "main" unless a test says
/// otherwise.
struct Application {
    explicit Application(const std::string& url, int batchSize = 50, const std::string& endpoint = "main",
                         DeliveryObserver observer = {})
        : Application(url, UploadBatchEventConfig(batchSize, false), endpoint, std::move(observer)) {}
    Application(const std::string& url, const UploadBatchEventConfig& config, const std::string& endpoint = "main",
                DeliveryObserver observer = {})
        : uploads(std::make_shared<UploadBatchEventProcessor>(Client{"com.example.player", "Player", "2.3", 117},
                                                              Endpoint{url, endpoint}, config)) {
        uploads->setDeliveryObserver(std::move(observer));
        sessions.processorManager()->add(uploads);
        sessions.start(Session::Kind::userEvents());
        sessions.tracker()->push(Screen{"home"});
    }

    void submit(int count = 1) {
        for (int i = 0; i < count; ++i) sessions.tracker()->submit<ScreenView>();
    }

    /// Waits until everything that was called so far has run.
    void drain() {
        std::promise<void> done;
        sessions.transaction([&](AccessSessionManager&) { done.set_value(); });
        done.get_future().wait();
    }

    DeliveryReport wait() { return uploads->waitForDelivery(std::chrono::steady_clock::now() + 20s); }

    /// Stops as a killed process does, without ending the session, once every document has its outcome; its files are
    /// closed then.
    void abandon() {
        sessions.processorManager()->remove(uploads);
        wait();
        wait();  // the task that removed it has gone by now, and with it the queue's hold
        uploads.reset();
        DeferredStoreCore::queue().sync([] {});
    }

    std::shared_ptr<UploadBatchEventProcessor> uploads;
    SessionManager sessions;
};

}  // namespace corvane::test
