#include <corvane/Context/Context.h>
#include <corvane/Session/SessionManager.h>
#include <corvane/Tracker/Tracker.h>

#include <utility>

namespace corvane {

namespace {

// Has each piece of context pushed, with the key that it has in a session.
template <class Push>
void pushEach(const Push& push) {
    push("operatingSystem", OperatingSystemInfo::current());
    push("machine", MachineInfo::current());
    push("locale", LocaleInfo::current());
    push("application", ApplicationInfo::current());
    push("process", ProcessInfo::current());
    if (auto display = DisplayInfo::current()) push("display", *std::move(display));
}

}  // namespace

void pushContext(Tracker& tracker) {
    pushEach([&](const char*, auto data) { tracker.push(std::move(data), {DataEventTrait::unique}); });
}

void pushContext(SessionManager& sessions) {
    pushEach([&](const char* key, auto data) {
        sessions.push(SessionData{key, std::move(data)}, {DataEventTrait::unique});
    });
}

}  // namespace corvane
