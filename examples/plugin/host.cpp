// A host that loads plug-ins when it runs: plugin_host PLUGIN.so...
//
// It declares its own events as types and shares its session with the plug-ins. Every event of the session is printed,
// whoever recorded it, and then what each plug-in has to say.

#include "Plugin.h"

#include <corvane/corvane.h>

#include <dlfcn.h>

#include <cstdio>
#include <vector>

using namespace corvane;

struct Listener {
    std::string id;
};
struct Track {
    std::string title;
};
struct TrackStarted {
    EventProperty<EventData> event = required;
    EventProperty<Track> track = required;
    EventProperty<Listener> listener = required;
};

namespace {

class Printing final : public EventProcessorType {
  public:
    void registerAccessQueue(std::shared_ptr<SerialQueue>) override {}
    void process(const ProcessEvent& event) override {
        std::printf("%s %s\n", event.name().c_str(), event.json().text().c_str());
    }
};

/// Loads a plug-in and starts it; nullptr, and a message, when it cannot be loaded.
std::shared_ptr<Plugin> load(const char* file, CVSessionManager& sessions) {
    void* object = dlopen(file, RTLD_NOW | RTLD_LOCAL);
    void* start = object ? dlsym(object, "startPlugin") : nullptr;
    std::shared_ptr<Plugin> plugin;
    if (start) reinterpret_cast<StartPlugin*>(start)(sessions, plugin);
    if (!plugin)
        std::fprintf(stderr, "plugin_host: cannot load %s: %s\n", file, start ? "it does not start" : dlerror());
    return plugin;
}

}  // namespace

int main(int argc, char** argv) {
    const auto sessions = std::make_shared<SessionManager>();
    sessions->processorManager()->add(std::make_shared<Printing>());
    CVSessionManager shared(sessions);
    std::vector<std::shared_ptr<Plugin>> plugins;
    for (int i = 1; i < argc; ++i) {
        auto plugin = load(argv[i], shared);
        if (!plugin) return 1;
        plugins.push_back(std::move(plugin));
    }

    sessions->start(Session::Kind::userEvents());
    sessions->tracker()->push(Listener{"l-7"});
    for (const char* title : {"Prelude", "Fugue"}) {
        sessions->tracker()->push(Track{title});
        sessions->tracker()->submit<TrackStarted>();
        for (const auto& plugin : plugins) plugin->trackStarted(title);
    }
    sessions->endSync();
    for (const auto& plugin : plugins) std::printf("plug-in: %s\n", plugin->summary().c_str());
    return 0;
}
