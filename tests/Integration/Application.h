#pragma once

#include <corvane/Store/DeferredStoreCore.h>
#include <corvane/corvane.h>

#include <chrono>
#include <memory>
#include <string>

namespace corvane::test {

using namespace std::chrono_literals;

struct Screen {
    std::string name;
};

struct ScreenView {
    EventProperty<EventData> event = required;
    EventProperty<Screen> screen = required;
};

/// An application as a host writes it, with the whole library behind it and an endpoint named "main".
struct Application {
    explicit Application(const std::string& url, int batchSize = 50, bool debugging = false)
        : uploads(std::make_shared<UploadBatchEventProcessor>(Client{"com.example.player", "Player", "2.3", 117},
                                                              Endpoint{url, "main"},
                                                              UploadBatchEventConfig(batchSize, debugging))) {
        sessions.processorManager()->add(uploads);
        sessions.start(Session::Kind::userEvents());
        sessions.tracker()->push(Screen{"home"});
    }

    void submit(int count = 1) {
        for (int i = 0; i < count; ++i) sessions.tracker()->submit<ScreenView>();
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
