#include "Recorder.h"

#include "Events.h"

#include <cstdio>
#include <utility>

namespace replay {

using corvane::DataEventTrait;

Recorder::Recorder(const std::shared_ptr<corvane::EventProcessorType>& processor)
    : tracker_(sessions_.tracker()->chain("replay")) {
    sessions_.processorManager()->add(processor);
    sessions_.start(corvane::Session::Kind::userEvents());
}

Recorder::~Recorder() {
    finish();  // completions use this object
}

void Recorder::record(AccessLogEntry entry) {
    if (linesInSession_ == linesPerSession) {
        // A running session keeps its events, so a file of any size needs a new one now and then.
        startNextSession();
    }
    ++linesInSession_;

    // Each takes the place of the one before: nothing piles up, however long the log.
    tracker_->push(
        Visitor{std::move(entry.address), std::move(entry.user), std::move(entry.agent), std::move(entry.referrer)},
        {DataEventTrait::unique});
    tracker_->push(
        Page{std::move(entry.method), std::move(entry.path), std::move(entry.query), std::move(entry.protocol)},
        {DataEventTrait::unique});
    tracker_->push(Response{entry.status, entry.bytes}, {DataEventTrait::unique});

    inFlight_.acquire();
    tracker_->explicitSubmit<PageRequest>(entry.time,
                                          [this](const corvane::EventSubmitResult& result) { completed(result); });
}

void Recorder::completed(const corvane::EventSubmitResult& result) {
    if (result.succeeded()) {
        ++submitted_;
    } else if (++failed_ == 1) {  // the first is enough to see what is wrong
        std::fprintf(stderr, "replay: an event was not recorded: %s\n", result.error()->what());
    }
    inFlight_.release();
}

void Recorder::startNextSession() {
    sessions_.endSync();
    sessions_.start(corvane::Session::Kind::userEvents());
    linesInSession_ = 0;
}

void Recorder::finish() {
    sessions_.endSync();  // completions run on the same queue, before it
}

}  // namespace replay
