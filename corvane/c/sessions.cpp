// Session managers.

#include <corvane/c/Call.h>
#include <corvane/c/Processor.h>
#include <corvane/c/Records.h>
#include <corvane/c/Sessions.h>
#include <corvane/c/Value.h>
#include <corvane/c/corvane.h>

#include <utility>

using namespace corvane;
using namespace corvane::c;

namespace {

using DoneCallback = Callback<void(void*, const corvane_error*)>;

std::function<void(const BridgedError*)> libraryCompletion(corvane_done done, Context context) {
    return [callback = DoneCallback(done, std::move(context))](const BridgedError* failed) {
        if (!failed) return callback(nullptr);
        const corvane_error record = recordOf(*failed);
        callback(&record);
    };
}

template <class Pushed>
void push(Pushed& manager, const char* key, const char* name, HostValue::Dictionary dictionary,
          const corvane_session_data_options* given) {
    const auto options = read(given, "the options");
    BridgedError refused;
    BridgedSessionData data(text(key, "the key"),
                            std::make_shared<BridgedRawDataEvent>(dataName(name), std::move(dictionary)));
    if (!manager.pushSessionData(data, traitsOf(options.traits), options.submit_queues, &refused)) throw refused;
}

}  // namespace

corvane_sessions* corvane_sessions_create(corvane_error* error) {
    return call(error, [] { return static_cast<corvane_sessions*>(make<Sessions>()); });
}

bool corvane_sessions_start(corvane_sessions* sessions, int32_t kind, const char* name, corvane_error* error) {
    return call(error, [&] {
        const Used<Sessions> used(sessions);
        BridgedError refused;
        if (!used->manager.startSessionForKind(static_cast<BridgedSessionKind>(kind), optionalText(name, "the name"),
                                               &refused)) {
            throw refused;
        }
    });
}

bool corvane_sessions_end(corvane_sessions* sessions, corvane_done done, void* context, corvane_destroy destroy,
                          corvane_error* error) {
    return call(error, context, destroy, [&](Context owned) {
        const Used<Sessions> used(sessions);
        used->manager.endSessionWithCompletion(
            [completion = libraryCompletion(done, std::move(owned))] { completion(nullptr); });
    });
}

bool corvane_sessions_end_and_wait(corvane_sessions* sessions, corvane_error* error) {
    return call(error, [&] {
        const Used<Sessions> used(sessions);
        requireMayWait();
        used->manager.sessionManager()->endSync();
    });
}

bool corvane_sessions_push(corvane_sessions* sessions, const char* key, const char* name, corvane_value* dictionary,
                           const corvane_session_data_options* options, corvane_error* error) {
    return call(error, [&] { push(Used<Sessions>(sessions)->manager, key, name, dictionaryOf(dictionary), options); });
}

bool corvane_sessions_push_json(corvane_sessions* sessions, const char* key, const char* name, const char* json,
                                const corvane_session_data_options* options, corvane_error* error) {
    return call(error, [&] { push(Used<Sessions>(sessions)->manager, key, name, dictionaryOfJSON(json), options); });
}

bool corvane_sessions_transaction(corvane_sessions* sessions, corvane_session_block block, void* context,
                                  corvane_destroy destroy, corvane_error* error) {
    return call(error, context, destroy, [&](Context owned) {
        const Used<Sessions> used(sessions);
        const Callback<void(void*, corvane_session_access*)> callback(block, std::move(owned));
        used->manager.transaction([callback](const std::shared_ptr<BridgedAccessSessionManager>& access) {
            const Lent<SessionAccess> lent(access);
            callback(static_cast<corvane_session_access*>(lent.pointer()));
        });
    });
}

bool corvane_session_access_is_active(corvane_session_access* access, corvane_error* error) {
    return call(error, [&] { return Used<SessionAccess>(access)->access->isActive(); });
}

bool corvane_session_access_push(corvane_session_access* access, const char* key, const char* name,
                                 corvane_value* dictionary, const corvane_session_data_options* options,
                                 corvane_error* error) {
    return call(error,
                [&] { push(*Used<SessionAccess>(access)->access, key, name, dictionaryOf(dictionary), options); });
}

bool corvane_sessions_set_recording(corvane_sessions* sessions, bool is_on, corvane_done done, void* context,
                                    corvane_destroy destroy, corvane_error* error) {
    return call(error, context, destroy, [&](Context owned) {
        const Used<Sessions> used(sessions);
        used->manager.setRecording(is_on, libraryCompletion(done, std::move(owned)));
    });
}

bool corvane_sessions_is_recording(corvane_sessions* sessions, corvane_error* error) {
    return call(error, [&] { return Used<Sessions>(sessions)->manager.isRecording(); });
}

bool corvane_sessions_forget(corvane_sessions* sessions, corvane_forgotten done, void* context, corvane_destroy destroy,
                             corvane_error* error) {
    return call(error, context, destroy, [&](Context owned) {
        const Used<Sessions> used(sessions);
        const Callback<void(void*, std::int64_t, std::int64_t, const corvane_error*)> callback(done, std::move(owned));
        used->manager.forget([callback](const ForgottenRecords& forgotten, const BridgedError* failed) {
            const corvane_error record = failed ? recordOf(*failed) : corvane_error{};
            callback(forgotten.events, forgotten.documents, failed ? &record : nullptr);
        });
    });
}

uint64_t corvane_sessions_waiting_count(corvane_sessions* sessions, corvane_error* error) {
    return call(error, [&] { return Used<Sessions>(sessions)->manager.waitingCount(); });
}

bool corvane_sessions_suspend(corvane_sessions* sessions, corvane_error* error) {
    return call(error, [&] {
        const Used<Sessions> used(sessions);
        used->manager.tracker()->suspend();
        ++used->suspensions;
    });
}

bool corvane_sessions_resume(corvane_sessions* sessions, corvane_error* error) {
    return call(error, [&] {
        const Used<Sessions> used(sessions);
        int count = used->suspensions;
        do {
            if (count == 0) refuse(CORVANE_INVALID_ARGUMENT, "what is not suspended cannot be resumed");
        } while (!used->suspensions.compare_exchange_weak(count, count - 1));
        used->manager.tracker()->resume();
    });
}

bool corvane_sessions_add_processor(corvane_sessions* sessions, corvane_processor* processor, corvane_error* error) {
    return call(error, [&] {
        const Used<Sessions> used(sessions);
        BridgedError refused;
        const Used<ProcessorObject> added(processor);
        if (!used->manager.processorManager()->addEventProcessor(added->processor, &refused)) throw refused;
    });
}

bool corvane_sessions_remove_processor(corvane_sessions* sessions, corvane_processor* processor, corvane_error* error) {
    return call(error, [&] {
        const Used<Sessions> used(sessions);
        used->manager.processorManager()->removeEventProcessor(Used<ProcessorObject>(processor)->processor);
    });
}

bool corvane_sessions_resume_background(corvane_sessions* sessions, const char* identifier, corvane_done done,
                                        void* context, corvane_destroy destroy, corvane_error* error) {
    return call(error, context, destroy, [&](Context owned) {
        const Used<Sessions> used(sessions);
        const DoneCallback callback(done, std::move(owned), true);
        used->manager.processorManager()->resumeBackgroundProcessingForIdentifier(text(identifier, "the identifier"),
                                                                                  [callback] { callback(nullptr); });
    });
}

corvane_tracker* corvane_sessions_tracker(corvane_sessions* sessions, corvane_error* error) {
    return call(error, [&] {
        return static_cast<corvane_tracker*>(make<TrackerObject>(Used<Sessions>(sessions)->manager.tracker()));
    });
}
