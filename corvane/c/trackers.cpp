// Trackers, inside and outside of their queue.

#include <corvane/Tracker/Tracker.h>
#include <corvane/c/Call.h>
#include <corvane/c/EncodedText.h>
#include <corvane/c/Event.h>
#include <corvane/c/Records.h>
#include <corvane/c/Sessions.h>
#include <corvane/c/Value.h>
#include <corvane/c/corvane.h>

#include <utility>

using namespace corvane;
using namespace corvane::c;

namespace {

class Delayed final : public Object {
  public:
    static constexpr Kind kind = Kind::delayed;

    explicit Delayed(std::shared_ptr<DelayedToken> given) : token(std::move(given)) {}

    const std::shared_ptr<DelayedToken> token;
};

/// Ends its observation when it goes.
class Observer final : public Object {
  public:
    static constexpr Kind kind = Kind::observer;

    Observer(std::shared_ptr<BridgedTracker> observed, BridgedTracker::SessionChangeBlock block)
        : tracker_(std::move(observed)) {
        tracker_->onSessionChangeWithBlock(std::move(block))->disposeOnObject(bound_);
    }
    ~Observer() override { tracker_->removeSessionObserversForObject(bound_); }

  private:
    const std::shared_ptr<BridgedTracker> tracker_;
    const std::shared_ptr<const void> bound_ = std::make_shared<int>();
};

template <class Target>
void push(const Target& tracker, const char* name, HostValue::Dictionary dictionary,
          const corvane_push_options* given) {
    const auto options = read(given, "the options");
    BridgedError refused;
    auto data = std::make_shared<const BridgedRawDataEvent>(dataName(name), std::move(dictionary));
    if (!tracker->pushDataEvent(data, traitsOf(options.traits), optionalText(options.file, "the file"), options.line,
                                &refused)) {
        throw refused;
    }
}

template <class Target>
void pushJSON(const Target& tracker, const char* name, const char* json, const corvane_push_options* given) {
    const auto options = read(given, "the options");
    BridgedError refused;
    if (!tracker->pushEncodedDataEvent(dataName(name), encodedObject(json), traitsOf(options.traits),
                                       optionalText(options.file, "the file"), options.line, &refused)) {
        throw refused;
    }
}

BridgedSubmitCompletion completionOf(const corvane_submit_options& options, Context context) {
    if (!options.completion) return {};
    const Callback<void(void*, const corvane_process_event*, const corvane_error*)> callback(options.completion,
                                                                                             std::move(context));
    return [callback](const BridgedProcessEvent* event, const BridgedError* error) {
        if (event) {
            const auto record = recordOf(*event);
            callback(&record, nullptr);
        } else {
            const auto record = recordOf(*error);
            callback(nullptr, &record);
        }
    };
}

/// Reads the options first, whose context is destroyed whatever becomes of the call.
template <class F>
auto submit(const corvane_submit_options* given, corvane_error* error, F function) {
    corvane_submit_options options{};
    if (!call(error, [&] { options = read(given, "the options"); })) return decltype(function(options, {}))();
    return call(error, options.context, options.destroy,
                [&](Context context) { return function(options, completionOf(options, std::move(context))); });
}

using AccessBlock = Callback<void(void*, corvane_access*)>;

BridgedTracker::AccessBlock libraryBlock(corvane_block block, Context context) {
    return [callback = AccessBlock(block, std::move(context))](const std::shared_ptr<BridgedAccessTracker>& access) {
        const Lent<Access> lent(access);
        callback(static_cast<corvane_access*>(lent.pointer()));
    };
}

Date startOf(const corvane_timer_options& options) {
    return options.has_start ? date(options.start) : now();
}

}  // namespace

corvane_tracker* corvane_tracker_chain(corvane_tracker* tracker, const char* name, corvane_error* error) {
    return call(error, [&] {
        const Used<TrackerObject> used(tracker);
        BridgedError refused;
        auto child = used->tracker->chainWithName(text(name, "the tracker's name"), &refused);
        if (!child) throw refused;
        return static_cast<corvane_tracker*>(make<TrackerObject>(std::move(child)));
    });
}

const char* corvane_tracker_path(corvane_tracker* tracker, size_t index, corvane_error* error) {
    return call(error, [&] {
        const Used<TrackerObject> used(tracker);
        return index < used->path.size() ? used->path[index].c_str() : nullptr;
    });
}

bool corvane_tracker_push(corvane_tracker* tracker, const char* name, corvane_value* dictionary,
                          const corvane_push_options* options, corvane_error* error) {
    return call(error, [&] { push(Used<TrackerObject>(tracker)->tracker, name, dictionaryOf(dictionary), options); });
}

bool corvane_tracker_push_json(corvane_tracker* tracker, const char* name, const char* json,
                               const corvane_push_options* options, corvane_error* error) {
    return call(error, [&] { pushJSON(Used<TrackerObject>(tracker)->tracker, name, json, options); });
}

bool corvane_tracker_pop(corvane_tracker* tracker, const char* name, corvane_error* error) {
    return call(error,
                [&] { Used<TrackerObject>(tracker)->tracker->popDataEventByName(text(name, "the name of the data")); });
}

bool corvane_tracker_submit(corvane_tracker* tracker, corvane_event* event, const corvane_submit_options* options,
                            corvane_error* error) {
    return submit(options, error, [&](const corvane_submit_options& how, BridgedSubmitCompletion completion) {
        const Used<TrackerObject> used(tracker);
        const Date time = how.has_time ? date(how.time) : now();
        used->tracker->explicitSubmitRawEvent(Used<Event>(event)->use(), time, how.only_if_timed,
                                              std::move(completion));
        return true;
    });
}

corvane_delayed* corvane_tracker_submit_later(corvane_tracker* tracker, corvane_event* event,
                                              const corvane_submit_options* options, corvane_error* error) {
    return submit(options, error, [&](const corvane_submit_options& how, BridgedSubmitCompletion completion) {
        const Used<TrackerObject> used(tracker);
        if (how.has_time) refuse(CORVANE_INVALID_ARGUMENT, "a submission for later has the time of its call");
        auto token =
            used->tracker->delayedSubmitRawEvent(Used<Event>(event)->use(), how.only_if_timed, std::move(completion));
        return static_cast<corvane_delayed*>(make<Delayed>(std::move(token)));
    });
}

bool corvane_delayed_commit(corvane_delayed* delayed, corvane_error* error) {
    return call(error, [&] { Used<Delayed>(delayed)->token->commit(); });
}

bool corvane_tracker_time(corvane_tracker* tracker, corvane_event* event, const corvane_timer_options* options,
                          corvane_error* error) {
    return call(error, [&] {
        const Used<TrackerObject> used(tracker);
        const auto how = read(options, "the options");
        BridgedError refused;
        if (!used->tracker->timeRawEvent(Used<Event>(event)->use(), startOf(how), how.restart_with_session, &refused)) {
            throw refused;
        }
    });
}

bool corvane_tracker_enter_group(corvane_tracker* tracker, const char* name, corvane_error* error) {
    return call(error, [&] {
        const Used<TrackerObject> used(tracker);
        BridgedError refused;
        if (!used->tracker->enterGroupWithName(optionalText(name, "the group's name"), &refused)) throw refused;
    });
}

bool corvane_tracker_leave_group(corvane_tracker* tracker, corvane_error* error) {
    return call(error, [&] { Used<TrackerObject>(tracker)->tracker->leaveGroup(); });
}

bool corvane_tracker_transaction(corvane_tracker* tracker, corvane_block block, void* context, corvane_destroy destroy,
                                 corvane_error* error) {
    return call(error, context, destroy, [&](Context owned) {
        Used<TrackerObject>(tracker)->tracker->transactionWithBlock(libraryBlock(block, std::move(owned)));
    });
}

bool corvane_tracker_when_session(corvane_tracker* tracker, corvane_block block, void* context, corvane_destroy destroy,
                                  corvane_error* error) {
    return call(error, context, destroy, [&](Context owned) {
        Used<TrackerObject>(tracker)->tracker->whenSession(libraryBlock(block, std::move(owned)));
    });
}

bool corvane_access_push(corvane_access* access, const char* name, corvane_value* dictionary,
                         const corvane_push_options* options, corvane_error* error) {
    return call(error, [&] { push(Used<Access>(access)->access, name, dictionaryOf(dictionary), options); });
}

bool corvane_access_push_json(corvane_access* access, const char* name, const char* json,
                              const corvane_push_options* options, corvane_error* error) {
    return call(error, [&] { pushJSON(Used<Access>(access)->access, name, json, options); });
}

bool corvane_access_pop(corvane_access* access, const char* name, corvane_error* error) {
    return call(error, [&] {
        const Used<Access> used(access);
        BridgedError refused;
        if (!used->access->popDataEventByName(text(name, "the name of the data"), &refused)) throw refused;
    });
}

bool corvane_access_submit(corvane_access* access, corvane_event* event, const corvane_submit_options* options,
                           corvane_error* error) {
    return submit(options, error, [&](const corvane_submit_options& how, BridgedSubmitCompletion completion) {
        const Used<Access> used(access);
        if (how.has_time) refuse(CORVANE_INVALID_ARGUMENT, "a submission inside a block has the time of its call");
        used->access->submitRawEvent(Used<Event>(event)->use(), how.only_if_timed, std::move(completion));
        return true;
    });
}

bool corvane_access_time(corvane_access* access, corvane_event* event, const corvane_timer_options* options,
                         corvane_error* error) {
    return call(error, [&] {
        const Used<Access> used(access);
        const auto how = read(options, "the options");
        if (how.has_start) refuse(CORVANE_INVALID_ARGUMENT, "a timer inside a block runs since its call");
        BridgedError refused;
        if (!used->access->timeRawEvent(Used<Event>(event)->use(), how.restart_with_session, &refused)) throw refused;
    });
}

corvane_observer* corvane_tracker_observe(corvane_tracker* tracker, corvane_session_change block, void* context,
                                          corvane_destroy destroy, corvane_error* error) {
    return call(error, context, destroy, [&](Context owned) {
        const Used<TrackerObject> used(tracker);
        const Callback<void(void*, corvane_access*, std::int32_t)> callback(block, std::move(owned));
        return static_cast<corvane_observer*>(make<Observer>(
            used->tracker, [callback](const std::shared_ptr<BridgedAccessTracker>& access, SessionChange change) {
                const Lent<Access> lent(access);
                callback(static_cast<corvane_access*>(lent.pointer()), static_cast<std::int32_t>(change));
            }));
    });
}
