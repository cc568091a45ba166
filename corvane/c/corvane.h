#ifndef CORVANE_C_CORVANE_H
#define CORVANE_C_CORVANE_H

/*
 * Corvane for hosts in C, and for every language that can call C. Plain C99; also C++.
 *
 *     corvane_error error = CORVANE_ERROR_INIT;
 *     corvane_sessions *sessions = corvane_sessions_create(&error);
 *     corvane_sessions_start(sessions, CORVANE_USER_EVENTS, NULL, &error);
 *     corvane_tracker *tracker = corvane_sessions_tracker(sessions, &error);
 *     corvane_event *view = corvane_event_create("ScreenView", &error);
 *     corvane_event_require(view, "screen", "Screen", &error);
 *     corvane_tracker_push_json(tracker, "Screen", "{\"name\": \"home\"}", NULL, &error);
 *     corvane_tracker_submit(tracker, view, NULL, &error);
 *     corvane_sessions_end_and_wait(sessions, &error);
 *
 * Objects. Whatever a function returns as a pointer to an object belongs to the caller, who lets go of it with
 * `corvane_release`; an object that another one needs is kept by that one. An object that was passed to a callback is
 * good for the length of the call, unless the callback retains it. What a pointer points to is the library's affair: a
 * null pointer, an object that was released, and one of another kind are errors that are reported, never undefined.
 *
 * Errors. A function that may fail takes a `corvane_error *` last, which may be null. It returns false, or a null
 * pointer, and fills the error; what it refuses has no effect, and nothing is lost. A success clears the error, which
 * one thread at a time may use. No exception leaves a function.
 *
 * Threads. Every function may be called on any thread, in callbacks too, and on several at once. Except those that say
 * that they wait, they enqueue their work and return at once; what waits is refused inside a callback of the library's,
 * unless that runs on the main queue. Unless it says otherwise, a callback runs on the queue of its session manager,
 * one at a time and in order, on a thread of the library's that blocks all signals; it must not take long, throw, or
 * jump out.
 *
 * Callbacks come with a context, which is passed to them, and a function that destroys it, which may be null. It is
 * called once, on any thread, when the callback is not called any more; also when the function that took it has
 * failed, or the callback was null, unless the structure that names it was refused for its size.
 *
 * Text is UTF-8 and ends with a zero. What is passed in is copied; what is handed out is good as long as the object
 * that it was asked of, or for the length of the callback that it was passed to.
 *
 * Structures begin with their size, so that later versions may add members at the end: `= {.size = sizeof(...)}`.
 * Members that are zero have their default values. The library reads and fills what the caller's size has room for.
 *
 * Forks. A process that forks goes on as before. In its child every function but `corvane_release`, which does nothing,
 * reports CORVANE_FORKED once the parent has used the library; a child that records events is started anew (exec), or
 * forked off before.
 *
 * The binary interface is stable: functions, constants and members stay, and new ones are added.
 */

/* NOLINTBEGIN(modernize-*): C */
#include <stdbool.h>
#include <stddef.h>
#include <stdint.h>

#if defined(__GNUC__)
#define CORVANE_C_API __attribute__((visibility("default")))
#else
#define CORVANE_C_API
#endif

#ifdef __cplusplus
extern "C" {
#endif

/* The version of the library that runs, such as "0.1.0". */
CORVANE_C_API const char* corvane_version(void);

/* ---- Errors ------------------------------------------------------------------------------------------------------ */

/* Why a call was refused or something has failed. The library's own errors keep their domain and code: see the header
 * of the class that a message comes from. */
typedef struct corvane_error {
    size_t size;
    int32_t code;       /* a value of the domain's enumeration */
    char domain[60];    /* such as "Corvane.TrackerError"; empty without an error */
    char message[1024]; /* for a person; cut at the end of a character if it is longer */
} corvane_error;

#define CORVANE_ERROR_INIT \
    { sizeof(corvane_error), 0, "", "" }

/* The codes of the domain "Corvane.CError": what this interface itself refuses. */
enum {
    CORVANE_NO_OBJECT = 0,        /* a null pointer where an object or a text is needed */
    CORVANE_RELEASED_OBJECT = 1,  /* the object was released, or there never was one */
    CORVANE_WRONG_KIND = 2,       /* the object is of another kind */
    CORVANE_INVALID_ARGUMENT = 3, /* a text, a number or a size that cannot be used */
    CORVANE_INVALID_JSON = 4,     /* text that is not a JSON object */
    CORVANE_WOULD_WAIT = 5,       /* a call that waits, in a callback */
    CORVANE_FORKED = 6,           /* in a child of the process that has used the library */
    CORVANE_IN_USE = 7            /* an event that was submitted, or a processor that was added, cannot be changed */
};

/* ---- Objects ----------------------------------------------------------------------------------------------------- */

typedef struct corvane_sessions corvane_sessions;             /* a session manager */
typedef struct corvane_session_access corvane_session_access; /* one inside a transaction */
typedef struct corvane_tracker corvane_tracker;
typedef struct corvane_access corvane_access;     /* a tracker inside a transaction or an observer */
typedef struct corvane_event corvane_event;       /* what an event is called and carries */
typedef struct corvane_value corvane_value;       /* a dictionary or an array */
typedef struct corvane_delayed corvane_delayed;   /* a submission that waits for its word */
typedef struct corvane_observer corvane_observer; /* an observation of sessions */
typedef struct corvane_snapshot corvane_snapshot;
typedef struct corvane_evaluation corvane_evaluation; /* an event held against a snapshot */
typedef struct corvane_processor corvane_processor;
typedef struct corvane_text corvane_text; /* what a callback writes text into */
typedef struct corvane_task corvane_task; /* something to do, or to report as done */

/* Keeps an object; to be released once more. Returns the object; null for what is none. */
CORVANE_C_API void* corvane_retain(void* object);

/* Lets go of an object, which goes when nobody has it any more. Does nothing for null; for what is no object, or was
 * released before, it writes an error to the log. What waits to be done with the object is done all the same. */
CORVANE_C_API void corvane_release(void* object);

/* Destroys the context of a callback. */
typedef void (*corvane_destroy)(void* context);

/* Ends every callback that was registered with this `destroy`, and calls of `destroy` too: none begins any more, and
 * those that run have returned when this returns: it waits for them, unless it is called inside one of them. For a
 * language whose runtime ends before the process does. What was registered goes on otherwise, and its contexts are
 * kept. */
CORVANE_C_API bool corvane_callbacks_stop(corvane_destroy destroy, corvane_error* error);

/* ---- Times ------------------------------------------------------------------------------------------------------- */

/* Milliseconds since 1970-01-01T00:00:00Z. */
typedef int64_t corvane_time;

/* ---- Values ------------------------------------------------------------------------------------------------------ */

/* Dictionaries and arrays are made by calls or from JSON text, and may be changed at any time: whoever takes one takes
 * what it holds at that moment. They nest up to 128 levels deep. Of two entries of one key the later one counts, in its
 * place. Integers beyond 64 bits in a JSON text are real numbers; one beyond those is refused. */
CORVANE_C_API corvane_value* corvane_dictionary_create(corvane_error* error);
CORVANE_C_API corvane_value* corvane_array_create(corvane_error* error);
/* From the text of an object or an array. */
CORVANE_C_API corvane_value* corvane_value_from_json(const char* json, corvane_error* error);

/* Adds an entry to a dictionary. A number that is not finite is refused. */
CORVANE_C_API bool corvane_dictionary_set_null(corvane_value* dictionary, const char* key, corvane_error* error);
CORVANE_C_API bool corvane_dictionary_set_bool(corvane_value* dictionary, const char* key, bool value,
                                               corvane_error* error);
CORVANE_C_API bool corvane_dictionary_set_integer(corvane_value* dictionary, const char* key, int64_t value,
                                                  corvane_error* error);
CORVANE_C_API bool corvane_dictionary_set_unsigned(corvane_value* dictionary, const char* key, uint64_t value,
                                                   corvane_error* error);
CORVANE_C_API bool corvane_dictionary_set_real(corvane_value* dictionary, const char* key, double value,
                                               corvane_error* error);
CORVANE_C_API bool corvane_dictionary_set_string(corvane_value* dictionary, const char* key, const char* value,
                                                 corvane_error* error);
CORVANE_C_API bool corvane_dictionary_set_value(corvane_value* dictionary, const char* key, corvane_value* value,
                                                corvane_error* error);

/* Adds an element to an array. */
CORVANE_C_API bool corvane_array_add_null(corvane_value* array, corvane_error* error);
CORVANE_C_API bool corvane_array_add_bool(corvane_value* array, bool value, corvane_error* error);
CORVANE_C_API bool corvane_array_add_integer(corvane_value* array, int64_t value, corvane_error* error);
CORVANE_C_API bool corvane_array_add_unsigned(corvane_value* array, uint64_t value, corvane_error* error);
CORVANE_C_API bool corvane_array_add_real(corvane_value* array, double value, corvane_error* error);
CORVANE_C_API bool corvane_array_add_string(corvane_value* array, const char* value, corvane_error* error);
CORVANE_C_API bool corvane_array_add_value(corvane_value* array, corvane_value* value, corvane_error* error);

/* ---- Events ------------------------------------------------------------------------------------------------------ */

/* The names of the records that the library itself makes for an event: what identifies it, and how long it took. An
 * event that has a property with one of them gets the library's record; hosts push no data of these names. */
#define CORVANE_EVENT_DATA "EventData"
#define CORVANE_TIMED_DATA "TimedData"

/* Declares an event, best made once and submitted often. */
CORVANE_C_API corvane_event* corvane_event_create(const char* name, corvane_error* error);
/* Adds a property, behind those that were added before: `property` is its name in the event's JSON, `data` the name of
 * the data that fills it. Without data, a submission fails when the property is required, and leaves an allowed one
 * out. Refused once the event was used, and for a second property of one name. */
CORVANE_C_API bool corvane_event_require(corvane_event* event, const char* property, const char* data,
                                         corvane_error* error);
CORVANE_C_API bool corvane_event_allow(corvane_event* event, const char* property, const char* data,
                                       corvane_error* error);

/* An event that was submitted. */
typedef struct corvane_process_event {
    size_t size;
    const char* name;
    const char* version; /* of the format of events */
    const char* json;    /* compact; an object */
    size_t json_length;  /* bytes, without the zero */
    const char* group;   /* the innermost group that its tracker was in, or null */
} corvane_process_event;

/* ---- Sessions ---------------------------------------------------------------------------------------------------- */

/* What a session is for. */
enum {
    CORVANE_USER_EVENTS = 0,
    CORVANE_TELEMETRY = 1,
    CORVANE_REALTIME = 2,
    CORVANE_CUSTOM = 3 /* a kind of the host's own, which has a name */
};

/* Makes a session manager, with a queue of its own. When it goes, everything that was called before still reaches the
 * processors, and no session is ended; its trackers can be used as before, but their submissions fail. */
CORVANE_C_API corvane_sessions* corvane_sessions_create(corvane_error* error);

/* Starts a session, unless one runs. `name` is that of a custom kind; null and other kinds have none. */
CORVANE_C_API bool corvane_sessions_start(corvane_sessions* sessions, int32_t kind, const char* name,
                                          corvane_error* error);

/* Something is done. `error` is null unless it has failed. */
typedef void (*corvane_done)(void* context, const corvane_error* error);

/* Ends the session, if one runs. `done` may be null; it is called also when there was nothing to end. */
CORVANE_C_API bool corvane_sessions_end(corvane_sessions* sessions, corvane_done done, void* context,
                                        corvane_destroy destroy, corvane_error* error);
/* The same; waits until the session has ended. Does nothing while the queue is suspended. */
CORVANE_C_API bool corvane_sessions_end_and_wait(corvane_sessions* sessions, corvane_error* error);

/* How session data is pushed. */
typedef struct corvane_session_data_options {
    size_t size;
    uint32_t traits;    /* CORVANE_ONLY_ONCE and CORVANE_UNIQUE */
    bool submit_queues; /* processors send first what they have collected under the data before */
} corvane_session_data_options;

/* Puts data into this and later sessions under `key`. Data of one `name` shares a stack, of which a session carries the
 * newest. `options` may be null. */
CORVANE_C_API bool corvane_sessions_push(corvane_sessions* sessions, const char* key, const char* name,
                                         corvane_value* dictionary, const corvane_session_data_options* options,
                                         corvane_error* error);
CORVANE_C_API bool corvane_sessions_push_json(corvane_sessions* sessions, const char* key, const char* name,
                                              const char* json, const corvane_session_data_options* options,
                                              corvane_error* error);

/* Runs a block on the queue, in one piece. In it, `access` is good. */
typedef void (*corvane_session_block)(void* context, corvane_session_access* access);
CORVANE_C_API bool corvane_sessions_transaction(corvane_sessions* sessions, corvane_session_block block, void* context,
                                                corvane_destroy destroy, corvane_error* error);
/* Inside a transaction: whether a session runs; and a push that is done when it returns. */
CORVANE_C_API bool corvane_session_access_is_active(corvane_session_access* access, corvane_error* error);
CORVANE_C_API bool corvane_session_access_push(corvane_session_access* access, const char* key, const char* name,
                                               corvane_value* dictionary, const corvane_session_data_options* options,
                                               corvane_error* error);

/* Consent. Switches recording on or off, for all session managers of all processes that use the documents directory,
 * and for later runs. `done`, which may be null, is called when the choice is on disk. */
CORVANE_C_API bool corvane_sessions_set_recording(corvane_sessions* sessions, bool is_on, corvane_done done,
                                                  void* context, corvane_destroy destroy, corvane_error* error);
/* Whether events are recorded; false with an error, too. */
CORVANE_C_API bool corvane_sessions_is_recording(corvane_sessions* sessions, corvane_error* error);

/* Forgets everything that was recorded in the documents directory and is not delivered. `done`, which may be null, is
 * told how much was dropped, and why something may be left. */
typedef void (*corvane_forgotten)(void* context, int64_t events, int64_t documents, const corvane_error* error);
CORVANE_C_API bool corvane_sessions_forget(corvane_sessions* sessions, corvane_forgotten done, void* context,
                                           corvane_destroy destroy, corvane_error* error);

/* How many calls wait in memory, for a producer that slows down; 0 with an error. */
CORVANE_C_API uint64_t corvane_sessions_waiting_count(corvane_sessions* sessions, corvane_error* error);

/* Stops the queue after the task that runs, until as many calls of `resume`. To resume what is not suspended is
 * refused. */
CORVANE_C_API bool corvane_sessions_suspend(corvane_sessions* sessions, corvane_error* error);
CORVANE_C_API bool corvane_sessions_resume(corvane_sessions* sessions, corvane_error* error);

/* Adds a processor, behind those that were added before; it learns of a session that runs. Removes it: it is not called
 * any more by what is enqueued afterwards. */
CORVANE_C_API bool corvane_sessions_add_processor(corvane_sessions* sessions, corvane_processor* processor,
                                                  corvane_error* error);
CORVANE_C_API bool corvane_sessions_remove_processor(corvane_sessions* sessions, corvane_processor* processor,
                                                     corvane_error* error);

/* Hands on that the host was woken for the transfer session `identifier`, the last argument of the wake command. `done`
 * is called, on the main queue, once everything that was pending there is delivered. */
CORVANE_C_API bool corvane_sessions_resume_background(corvane_sessions* sessions, const char* identifier,
                                                      corvane_done done, void* context, corvane_destroy destroy,
                                                      corvane_error* error);

/* ---- Trackers ---------------------------------------------------------------------------------------------------- */

/* How pushed data behaves on its stack. */
enum {
    CORVANE_ONLY_ONCE = 1, /* it leaves the stack with the first event that finds it */
    CORVANE_UNIQUE = 2     /* it takes the place of everything on the stack */
};

/* The root tracker of a session manager; and a child, whose events find its own data first, then its parents'. */
CORVANE_C_API corvane_tracker* corvane_sessions_tracker(corvane_sessions* sessions, corvane_error* error);
CORVANE_C_API corvane_tracker* corvane_tracker_chain(corvane_tracker* tracker, const char* name, corvane_error* error);
/* The names from the root, 0, down to the tracker itself; null beyond that, and with an error. */
CORVANE_C_API const char* corvane_tracker_path(corvane_tracker* tracker, size_t index, corvane_error* error);

/* How data is pushed. */
typedef struct corvane_push_options {
    size_t size;
    uint32_t traits;  /* CORVANE_ONLY_ONCE and CORVANE_UNIQUE */
    const char* file; /* where in the host's code, for messages; may be null */
    uint32_t line;
} corvane_push_options;

/* Puts data in scope under its name, until it is popped. `options` may be null. */
CORVANE_C_API bool corvane_tracker_push(corvane_tracker* tracker, const char* name, corvane_value* dictionary,
                                        const corvane_push_options* options, corvane_error* error);
CORVANE_C_API bool corvane_tracker_push_json(corvane_tracker* tracker, const char* name, const char* json,
                                             const corvane_push_options* options, corvane_error* error);
/* Takes the newest data of the name that was pushed here out of scope; nothing if there is none. */
CORVANE_C_API bool corvane_tracker_pop(corvane_tracker* tracker, const char* name, corvane_error* error);

/* Called once with the outcome: the event that was handed on, and by then stored by every processor that stores, or the
 * error that has stopped it. The other one is null. */
typedef void (*corvane_completion)(void* context, const corvane_process_event* event, const corvane_error* error);

/* How an event is submitted. */
typedef struct corvane_submit_options {
    size_t size;
    bool only_if_timed; /* only if a timer runs for the event on this tracker; otherwise nothing happens at all */
    bool has_time;      /* the event is of `time`, and not of now */
    corvane_time time;
    corvane_completion completion; /* may be null */
    void* context;
    corvane_destroy destroy;
} corvane_submit_options;

/* Submits an event with the data in scope. `options` may be null. */
CORVANE_C_API bool corvane_tracker_submit(corvane_tracker* tracker, corvane_event* event,
                                          const corvane_submit_options* options, corvane_error* error);
/* Prepares a submission that has the time of this call; `time` of the options must not be set. */
CORVANE_C_API corvane_delayed* corvane_tracker_submit_later(corvane_tracker* tracker, corvane_event* event,
                                                            const corvane_submit_options* options,
                                                            corvane_error* error);
/* Makes the submission; once. One that is released before submits nothing. */
CORVANE_C_API bool corvane_delayed_commit(corvane_delayed* delayed, corvane_error* error);

/* How an event is timed. */
typedef struct corvane_timer_options {
    size_t size;
    bool has_start; /* it has run since `start`, and not since now */
    corvane_time start;
    bool restart_with_session; /* submit when a session is about to end, and time anew when the next one has started */
} corvane_timer_options;

/* Starts a timer, unless one runs for the event. It ends with the next submission of the event on this tracker, which
 * carries it as CORVANE_TIMED_DATA if it requires that. `options` may be null. */
CORVANE_C_API bool corvane_tracker_time(corvane_tracker* tracker, corvane_event* event,
                                        const corvane_timer_options* options, corvane_error* error);

/* Enters a group, null for one without a name: events of this tracker, and of those below it, carry the innermost one.
 * Leaves the innermost group of the nearest tracker that has one; nothing if there is none. */
CORVANE_C_API bool corvane_tracker_enter_group(corvane_tracker* tracker, const char* name, corvane_error* error);
CORVANE_C_API bool corvane_tracker_leave_group(corvane_tracker* tracker, corvane_error* error);

/* Runs a block on the queue, in one piece: now, or as soon as a session runs. In it, `access` is good; it may be
 * retained, and used in later blocks of the same tracker. */
typedef void (*corvane_block)(void* context, corvane_access* access);
CORVANE_C_API bool corvane_tracker_transaction(corvane_tracker* tracker, corvane_block block, void* context,
                                               corvane_destroy destroy, corvane_error* error);
CORVANE_C_API bool corvane_tracker_when_session(corvane_tracker* tracker, corvane_block block, void* context,
                                                corvane_destroy destroy, corvane_error* error);
/* The same calls inside a block: done when they return. */
CORVANE_C_API bool corvane_access_push(corvane_access* access, const char* name, corvane_value* dictionary,
                                       const corvane_push_options* options, corvane_error* error);
CORVANE_C_API bool corvane_access_push_json(corvane_access* access, const char* name, const char* json,
                                            const corvane_push_options* options, corvane_error* error);
CORVANE_C_API bool corvane_access_pop(corvane_access* access, const char* name, corvane_error* error);
CORVANE_C_API bool corvane_access_submit(corvane_access* access, corvane_event* event,
                                         const corvane_submit_options* options, corvane_error* error);
CORVANE_C_API bool corvane_access_time(corvane_access* access, corvane_event* event,
                                       const corvane_timer_options* options, corvane_error* error);

/* A step of a session's life. */
enum { CORVANE_WILL_START = 0, CORVANE_DID_START = 1, CORVANE_WILL_END = 2, CORVANE_DID_END = 3 };

/* Observes the sessions of a tracker's manager, until the observer is released or its tracker has gone. */
typedef void (*corvane_session_change)(void* context, corvane_access* access, int32_t change);
CORVANE_C_API corvane_observer* corvane_tracker_observe(corvane_tracker* tracker, corvane_session_change block,
                                                        void* context, corvane_destroy destroy, corvane_error* error);

/* ---- Snapshots --------------------------------------------------------------------------------------------------- */

/* What a snapshot copies. */
enum {
    CORVANE_SNAPSHOT_NOW = 0, /* of each name the data in scope */
    CORVANE_SNAPSHOT_ALL = 1  /* every data of every stack; an evaluation takes the oldest of the nearest tracker */
};

/* Copies the data and timers in scope. Waits for the queue. */
CORVANE_C_API corvane_snapshot* corvane_tracker_snapshot(corvane_tracker* tracker, int32_t policy,
                                                         corvane_error* error);
/* What an event would carry, and what it lacks. CORVANE_EVENT_DATA is always missing: no event was made. */
CORVANE_C_API corvane_evaluation* corvane_snapshot_evaluate(corvane_snapshot* snapshot, corvane_event* event,
                                                            corvane_error* error);
/* Whether nothing that is required is missing; false with an error, too. */
CORVANE_C_API bool corvane_evaluation_is_valid(corvane_evaluation* evaluation, corvane_error* error);

/* One property of the event, in the order of its declaration. */
typedef struct corvane_evaluated {
    size_t size;
    const char* property;
    bool is_optional; /* known of what is missing */
    bool is_missing;
    const char* json; /* the data; null when it is missing */
} corvane_evaluated;

/* Those that are there, from 0, and then those that are missing. Returns false, without an error, behind the last. */
CORVANE_C_API bool corvane_evaluation_property(corvane_evaluation* evaluation, size_t index,
                                               corvane_evaluated* property, corvane_error* error);

/* ---- Processors -------------------------------------------------------------------------------------------------- */

/* A session as processors see it. */
typedef struct corvane_session {
    size_t size;
    const char* identifier;
    int32_t kind;
    const char* name; /* of a custom kind; otherwise null */
    corvane_time start;
    const char* json; /* an object: "sessionID" and one entry for each session data in effect */
} corvane_session;

/* Why an event was not accepted. Later versions may know more reasons. */
enum {
    CORVANE_REJECTED_NO_SESSION = 0,
    CORVANE_REJECTED_MISSING_DATA = 1,
    CORVANE_REJECTED_ENCODING = 2,
    CORVANE_REJECTED_NOT_RECORDING = 3,
    CORVANE_REJECTED_OTHER = 4
};

/* A processor of the host's. Members that are null are not called. */
typedef struct corvane_processor_callbacks {
    size_t size;
    void (*process)(void* context, const corvane_process_event* event);
    void (*did_start_session)(void* context, const corvane_session* session);
    /* The data of the session has changed; `submit_queues` asks for what is collected to be sent now. */
    void (*did_update_session)(void* context, const corvane_session* session, bool submit_queues);
    void (*did_end_session)(void* context, const corvane_session* session, corvane_time end);
    void (*did_enter_group)(void* context, const char* name, corvane_time start);
    void (*did_leave_group)(void* context, const char* name, corvane_time start);
    void (*did_reject)(void* context, const char* name, int32_t reason, const corvane_error* error);
    /* Everything recorded is to be forgotten: adds what was dropped to the counts. */
    void (*forget)(void* context, int64_t* events, int64_t* documents);
    /* Whether the transfer session is this processor's: then it retains `done`, and runs it when all is delivered. */
    bool (*resume_background)(void* context, const char* identifier, corvane_task* done);
} corvane_processor_callbacks;

CORVANE_C_API corvane_processor* corvane_processor_create(const corvane_processor_callbacks* callbacks, void* context,
                                                          corvane_destroy destroy, corvane_error* error);

/* Does what a task is for, once: a second call is refused. */
CORVANE_C_API bool corvane_task_run(corvane_task* task, corvane_error* error);
/* Replaces what a callback says. */
CORVANE_C_API bool corvane_text_set(corvane_text* text, const char* utf8, corvane_error* error);

/* How the logging processor writes events. */
enum {
    CORVANE_LOG_JSON = 0,
    CORVANE_LOG_CUSTOM = 1, /* by a formatter of the host's */
    CORVANE_LOG_DEFAULT = 2
};

/* Writes every event, session change and group to the log, at debug level. `formatter` belongs to CORVANE_LOG_CUSTOM,
 * and is null otherwise. */
typedef void (*corvane_formatter)(void* context, const corvane_process_event* event, corvane_text* line);
CORVANE_C_API corvane_processor* corvane_logging_create(int32_t format, corvane_formatter formatter, void* context,
                                                        corvane_destroy destroy, corvane_error* error);

/* Keeps the events of one session in `keep_one_in` for a processor, and drops those of the others. It is added in place
 * of that one. */
CORVANE_C_API corvane_processor* corvane_sampling_create(corvane_processor* processor, int32_t keep_one_in,
                                                         corvane_error* error);

/* What becomes of an event. */
enum {
    CORVANE_DROP = 0,
    CORVANE_KEEP = 1,
    CORVANE_REPLACE = 2 /* it goes on with the JSON that the filter has set: an object */
};

/* Drops or rewrites events before a processor gets them. It is added in place of that one. Whatever a filter returns
 * that is none of the above drops the event. */
typedef int32_t (*corvane_filter)(void* context, const corvane_process_event* event, corvane_text* replacement);
CORVANE_C_API corvane_processor* corvane_filtering_create(corvane_processor* processor, corvane_filter filter,
                                                          void* context, corvane_destroy destroy, corvane_error* error);

/* ---- Uploads ----------------------------------------------------------------------------------------------------- */

/* What must survive of what was acknowledged. */
enum {
    CORVANE_SURVIVES_KILL = 0,     /* the death of the process, at any moment */
    CORVANE_SURVIVES_POWER_CUT = 1 /* a power cut, too: completions wait for the disk */
};

/* A further header is added by `corvane_header_add`, inside the callback that asks for headers. */
typedef struct corvane_headers corvane_headers;
CORVANE_C_API bool corvane_header_add(corvane_headers* headers, const char* name, const char* value,
                                      corvane_error* error);

/* What is uploaded, and where to. The first six are needed; of the others, zero is the default. */
typedef struct corvane_upload_options {
    size_t size;
    const char* identifier; /* of the application, such as "com.example.player" */
    const char* name;       /* of the application, for people */
    const char* version;    /* such as "2.3" */
    int64_t build;
    const char* url;      /* absolute; http or https */
    const char* endpoint; /* the name that keys what is kept for the destination on disk */

    const char* trusted_certificates; /* absolute path of a file or directory, in place of the system's */
    int32_t batch_size;               /* events in a document; 50 */
    bool batch_debugging;             /* whether readable copies of documents and answers are kept */
    int64_t maximum_bytes_on_disk;    /* 1 GiB */
    int64_t maximum_age;              /* of a stored document, milliseconds; any */
    int64_t maximum_delay;            /* until an open batch is sent, milliseconds; none */
    int64_t retry_delay;              /* until a document is sent again, milliseconds; the next run */
    int32_t durability;               /* CORVANE_SURVIVES_KILL */

    /* Asked for further headers whenever a document is handed over, as for an authorisation token: on a queue of its
     * own, at most two calls at a time. May be null. */
    void (*headers)(void* context, corvane_headers* headers);
    void* context;
    corvane_destroy destroy;
} corvane_upload_options;

/* The batching processor, which keeps every event on disk until it is delivered. It is added to one session manager. */
CORVANE_C_API corvane_processor* corvane_uploads_create(const corvane_upload_options* options, corvane_error* error);

/* Hands the session's open batch over now. */
CORVANE_C_API bool corvane_uploads_flush(corvane_processor* uploads, corvane_error* error);

typedef struct corvane_count {
    int64_t events;
    int64_t documents;
} corvane_count;

/* What became of the documents of this run and earlier ones; of those the events are not known. */
typedef struct corvane_delivery_report {
    size_t size;
    corvane_count delivered;
    corvane_count pending; /* kept, and sent again, or under way */
    corvane_count given_up;
} corvane_delivery_report;

enum { CORVANE_ONLY_WHILE_REACHABLE = 1 /* do not wait for a server that is known to be unreachable */ };

/* Waits until everything that was handed over before has an outcome, `timeout` milliseconds at most. `report` may be
 * null. It returns true also when time has run out: see what is pending. */
CORVANE_C_API bool corvane_uploads_wait(corvane_processor* uploads, int64_t timeout, uint32_t flags,
                                        corvane_delivery_report* report, corvane_error* error);

/* What became of everything that was ever recorded for the endpoint: every event that was accepted is in exactly one of
 * those from `open` to `unknown`. */
typedef struct corvane_ledger {
    size_t size;
    corvane_count open;    /* in batches that are not handed over */
    corvane_count waiting; /* in documents that are stored */
    corvane_count delivered;
    corvane_count refused_4xx;
    corvane_count refused_3xx;
    corvane_count refused_other;
    corvane_count given_up_attempts;
    corvane_count given_up_age;
    corvane_count given_up_size;
    corvane_count given_up_payload_missing;
    corvane_count given_up_forgotten;
    corvane_count unknown;
    corvane_count sent_again; /* attempts that have failed; in no sum */
    int64_t rejected_no_session;
    int64_t rejected_missing_data;
    int64_t rejected_encoding;
    int64_t rejected_not_recording;
    int64_t rejected_other;
    int64_t accepted_in_run;
    int64_t unaccounted; /* of those that were accepted in this run; 0 */
} corvane_ledger;

/* The ledger as this process knows it; and as it is on disk, with what other processes did since. */
CORVANE_C_API bool corvane_uploads_ledger(corvane_processor* uploads, corvane_ledger* ledger, corvane_error* error);
typedef void (*corvane_ledger_read)(void* context, const corvane_ledger* ledger);
CORVANE_C_API bool corvane_uploads_read_ledger(corvane_processor* uploads, corvane_ledger_read done, void* context,
                                               corvane_destroy destroy, corvane_error* error);

/* A step of a document's delivery, and what decided on an outcome. Later versions may know more reasons. */
enum { CORVANE_UNDER_WAY = 0, CORVANE_PROGRESS = 1, CORVANE_DELIVERED = 2, CORVANE_DEFERRED = 3, CORVANE_GIVEN_UP = 4 };
enum {
    CORVANE_REASON_NONE = 0,
    CORVANE_REASON_ANSWER = 1,
    CORVANE_REASON_UNREACHABLE = 2,
    CORVANE_REASON_BLOCKED = 3,
    CORVANE_REASON_FAILED = 4,
    CORVANE_REASON_TOO_MANY_ATTEMPTS = 5,
    CORVANE_REASON_PAYLOAD_MISSING = 6,
    CORVANE_REASON_FORGOTTEN = 7,
    CORVANE_REASON_TOO_OLD = 8,
    CORVANE_REASON_NO_ROOM = 9,
    CORVANE_REASON_CANCELLED = 10
};

typedef struct corvane_delivery_update {
    size_t size;
    int32_t step;
    int32_t reason;
    const char* document;   /* the identifier in its metadata */
    int64_t events;         /* in the document; -1 where an earlier run or another process made it */
    int64_t status;         /* of HTTP; 0 without an answer */
    const char* problem;    /* in words, where a transfer has failed; otherwise empty */
    int64_t bytes_sent;     /* of the compressed document; for CORVANE_PROGRESS */
    int64_t bytes_expected; /* for CORVANE_PROGRESS */
} corvane_delivery_update;

/* Has `observer` told of every document as it happens, on the main queue, in place of one that was set before. Null
 * ends that. */
typedef void (*corvane_delivery_observer)(void* context, const corvane_delivery_update* update);
CORVANE_C_API bool corvane_uploads_observe(corvane_processor* uploads, corvane_delivery_observer observer,
                                           void* context, corvane_destroy destroy, corvane_error* error);

/* ---- The process ------------------------------------------------------------------------------------------------- */

/* Levels of the log. Below the one that is set, CORVANE_LEVEL_ERROR at first, nothing is written. */
enum { CORVANE_LEVEL_DEBUG = 0, CORVANE_LEVEL_DEFAULT = 1, CORVANE_LEVEL_ERROR = 2 };
CORVANE_C_API bool corvane_log_set_level(int32_t level, corvane_error* error);
/* Whether the host's data in messages is printed as "<private>". */
CORVANE_C_API bool corvane_log_set_hides_private(bool hides, corvane_error* error);
/* Sends messages to `sink` in place of standard error; null brings that back. It is called on any thread, on several at
 * once, and must not call the library and wait. */
typedef void (*corvane_log_sink)(void* context, int32_t level, const char* message);
CORVANE_C_API bool corvane_log_set_sink(corvane_log_sink sink, void* context, corvane_destroy destroy,
                                        corvane_error* error);

/* Where databases, payloads and the signing key are kept. To be set before the first processor is made. */
CORVANE_C_API bool corvane_documents_directory_set(const char* path, corvane_error* error);
/* Copies the path, with its zero, if `capacity` has room for it. Returns its length in bytes without the zero, whether
 * it was copied or not; 0 with an error. `buffer` may be null if `capacity` is 0. */
CORVANE_C_API size_t corvane_documents_directory_get(char* buffer, size_t capacity, corvane_error* error);

/* Has the tasks of the main queue run by the host's event loop: `executor` is called on any thread, keeps `task` with
 * `corvane_retain`, and has `corvane_task_run` called later, in the order of the calls. Null brings back a queue of the
 * library's own. */
typedef void (*corvane_executor)(void* context, corvane_task* task);
CORVANE_C_API bool corvane_main_queue_set_executor(corvane_executor executor, void* context, corvane_destroy destroy,
                                                   corvane_error* error);

/* How uploads run that outlive the process: see `corvane_transfers_use_agent`. Times are milliseconds; zero is the
 * default. */
typedef struct corvane_agent_options {
    size_t size;
    const char* program;             /* of the transfer agent; the one that was installed with the library */
    const char* directory;           /* of its journal; in the documents directory */
    const char* const* wake_command; /* a program by its absolute path, its arguments, and null; none */
    int64_t deadline;                /* for the agent to start or to answer; 5 s */
    int64_t hold_off;                /* until it is tried again; 30 s */
    int64_t idle_time;               /* until it ends with nothing to do; 10 s */
    int64_t retry_delay;             /* until it tries a server again, doubling; 1 s */
    int64_t patience;                /* of a task with a server that cannot be reached; 24 h */
    int64_t patience_without_host;   /* of the agent with such servers alone; 1 h */
} corvane_agent_options;

/* Whether the transfer agent was installed with the library. Looks at the disk; false with an error, too. */
CORVANE_C_API bool corvane_transfers_agent_is_available(corvane_error* error);
/* How documents are uploaded, for processors that are added afterwards: by the agent, a process of its own that
 * outlives the host; inside the process; or the default, by the agent where it is available. `options` may be null. */
CORVANE_C_API bool corvane_transfers_use_agent(const corvane_agent_options* options, corvane_error* error);
CORVANE_C_API bool corvane_transfers_use_in_process(corvane_error* error);
CORVANE_C_API bool corvane_transfers_use_default(corvane_error* error);

#ifdef __cplusplus
}
#endif

/* NOLINTEND(modernize-*) */

#endif
