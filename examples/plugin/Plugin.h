#pragma once

#include <corvane/Bridge/CV.h>

#include <memory>
#include <string>

// What the host and its plug-ins agree on. A plug-in is a shared object with one function:
//
//     extern "C" void startPlugin(corvane::CVSessionManager& sessions, std::shared_ptr<Plugin>& plugin)
//
// It registers its processors, records with the trackers of the host's session, and hands back what the host talks to.
// It links nothing of the library: the loader finds the library's symbols in the host. The host never unloads it, since
// what it has made may be called as long as the process runs.
class Plugin {
  public:
    virtual ~Plugin() = default;

    /// Something happened that the plug-in may care about.
    virtual void trackStarted(const std::string& title) = 0;
    /// What the plug-in has to say for itself. Called when the session is over.
    [[nodiscard]] virtual std::string summary() const = 0;
};

using StartPlugin = void(corvane::CVSessionManager& sessions, std::shared_ptr<Plugin>& plugin);
