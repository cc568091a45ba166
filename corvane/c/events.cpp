// Objects in general, errors, and the declarations of events.

#include <corvane/Platform/Log.h>
#include <corvane/c/Call.h>
#include <corvane/c/Event.h>
#include <corvane/c/corvane.h>

using namespace corvane;
using namespace corvane::c;

namespace {

bool addProperty(corvane_event* event, const char* property, const char* data,
                 BridgedEventPropertyRequirement requirement, corvane_error* error) {
    return call(error, [&] {
        const Used<Event> used(event);
        used->add(text(property, "the property's name"), text(data, "the name of the property's data"), requirement);
    });
}

}  // namespace

const char* corvane_version() {
    return CORVANE_VERSION;
}

void* corvane_retain(void* object) {
    return !isInChild() && objects::retain(object) ? object : nullptr;
}

void corvane_release(void* object) {
    if (!object || isInChild() || objects::release(object)) return;
    Log::shared().error("An object was released that was released before, or never was one");
}

bool corvane_callbacks_stop(corvane_destroy destroy, corvane_error* error) {
    return call(error, [&] { stopCallbacks(destroy); });
}

corvane_event* corvane_event_create(const char* name, corvane_error* error) {
    return call(error, [&] { return static_cast<corvane_event*>(make<Event>(text(name, "the event's name"))); });
}

bool corvane_event_require(corvane_event* event, const char* property, const char* data, corvane_error* error) {
    return addProperty(event, property, data, BridgedEventPropertyRequirement::required, error);
}

bool corvane_event_allow(corvane_event* event, const char* property, const char* data, corvane_error* error) {
    return addProperty(event, property, data, BridgedEventPropertyRequirement::optional, error);
}
