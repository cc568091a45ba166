/* The library from C: records what a user does, and waits until a collection server has it.
 *
 *     quickstart_c DOCUMENTS_DIRECTORY URL
 *
 * Every call reports its error; what it refuses has no effect. Here the first one ends the program. */

#include <corvane/c/corvane.h>

#include <stdio.h>
#include <stdlib.h>

static corvane_error error = CORVANE_ERROR_INIT;

static void require(bool done, const char *what) {
    if (done) return;
    fprintf(stderr, "quickstart_c: %s: %s (%s, %d)\n", what, error.message, error.domain, (int)error.code);
    exit(1);
}

/* Runs on the queue of the session manager. */
static void on_submitted(void *context, const corvane_process_event *event, const corvane_error *failed) {
    (void)context;
    if (event) {
        printf("accepted %s: %s\n", event->name, event->json);
    } else {
        printf("refused: %s\n", failed->message);
    }
}

int main(int count, char **arguments) {
    if (count != 3) {
        fprintf(stderr, "usage: quickstart_c DOCUMENTS_DIRECTORY URL\n");
        return 2;
    }
    require(corvane_documents_directory_set(arguments[1], &error), "the documents directory");

    /* What is uploaded, and where to. */
    const corvane_upload_options options = {.size = sizeof options,
                                            .identifier = "com.example.quickstart",
                                            .name = "Quickstart",
                                            .version = "1.0",
                                            .build = 1,
                                            .url = arguments[2],
                                            .endpoint = "main"};
    corvane_processor *uploads = corvane_uploads_create(&options, &error);
    require(uploads, "the uploads");
    corvane_sessions *sessions = corvane_sessions_create(&error);
    require(sessions, "the sessions");
    require(corvane_sessions_add_processor(sessions, uploads, &error), "adding the uploads");

    /* What an event is called, and what it carries. */
    corvane_event *view = corvane_event_create("ScreenView", &error);
    require(view, "the event");
    require(corvane_event_require(view, "event", CORVANE_EVENT_DATA, &error), "a property");
    require(corvane_event_require(view, "screen", "Screen", &error), "a property");
    require(corvane_event_allow(view, "viewer", "Viewer", &error), "a property");

    require(corvane_sessions_start(sessions, CORVANE_USER_EVENTS, NULL, &error), "the session");
    corvane_tracker *root = corvane_sessions_tracker(sessions, &error);
    require(root, "the root tracker");
    corvane_tracker *player = corvane_tracker_chain(root, "player", &error);
    require(player, "a tracker");

    /* Data as JSON text, or built by calls. */
    require(corvane_tracker_push_json(player, "Viewer", "{\"id\": \"u-1\"}", NULL, &error), "the viewer");
    corvane_value *screen = corvane_dictionary_create(&error);
    require(screen, "a dictionary");
    require(corvane_dictionary_set_string(screen, "name", "home", &error), "the name");
    require(corvane_dictionary_set_integer(screen, "depth", 1, &error), "the depth");
    require(corvane_tracker_push(player, "Screen", screen, NULL, &error), "the screen");

    const corvane_submit_options told = {.size = sizeof told, .completion = on_submitted};
    require(corvane_tracker_submit(player, view, &told, &error), "the event's submission");
    require(corvane_sessions_end_and_wait(sessions, &error), "the session's end");

    corvane_delivery_report report = {.size = sizeof report};
    require(corvane_uploads_wait(uploads, 10 * 1000, 0, &report, &error), "the wait");
    printf("delivered %d events in %d documents\n", (int)report.delivered.events, (int)report.delivered.documents);

    corvane_release(screen);
    corvane_release(player);
    corvane_release(root);
    corvane_release(view);
    corvane_release(sessions);
    corvane_release(uploads);
    return report.delivered.events == 1 ? 0 : 1;
}
