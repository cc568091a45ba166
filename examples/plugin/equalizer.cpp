// A plug-in: a shared object with events, data and a processor of its own, that the host knows nothing of.

#include "Plugin.h"

#include <cstdio>
#include <map>

using namespace corvane;

namespace {

/// Data as a class: for what has behaviour of its own.
class Preset final : public CVDataEventType {
  public:
    Preset(std::string name, std::vector<double> gains) : name_(std::move(name)), gains_(std::move(gains)) {}

    std::string dataName() const override { return "Preset"; }
    CVDictionary toDict() const override { return {{"name", name_}, {"gains", CVArray(gains_.begin(), gains_.end())}}; }

  private:
    std::string name_;
    std::vector<double> gains_;
};

/// An event as a class. The identity is the library's record; the listener is the host's own data, declared as a type
/// over there.
class PresetChosen final : public CVEventType {
  public:
    std::vector<CVEventProperty> eventProperties() const override {
        return {{CVEventData::dataClass(), CVEventPropertyRequirement::required, "event"},
                {CVDataEventClass("Preset"), CVEventPropertyRequirement::required, "preset"},
                {CVDataEventClass("Listener"), CVEventPropertyRequirement::optional, "listener"}};
    }
};

/// Counts the events of the session, the host's too.
class Tally final : public CVEventProcessorType {
  public:
    void registerAccessQueue(std::shared_ptr<SerialQueue>) override {}
    void processEvent(const CVProcessEvent& event) override { ++counts_[event.name()]; }
    void didEndSession(const CVSession&, Date) override {
        for (const auto& [name, count] : counts_) {
            summary_ += (summary_.empty() ? "" : ", ") + std::to_string(count) + " " + name;
        }
    }

    /// Once the session is over.
    [[nodiscard]] const std::string& summary() const { return summary_; }

  private:
    std::map<std::string, int> counts_;
    std::string summary_;
};

class Equalizer final : public Plugin {
  public:
    explicit Equalizer(CVSessionManager& sessions) : tracker_(sessions.tracker()->chainWithName("equalizer")) {
        sessions.processorManager()->addEventProcessor(tally_);
    }

    void trackStarted(const std::string& title) override {
        const bool isQuiet = title == "Prelude";
        tracker_->pushDataEvent(
            std::make_shared<Preset>(isQuiet ? "night" : "day", std::vector{0.5, isQuiet ? -3 : 2.}), {.unique = true});
        tracker_->submitEventType(presetChosen_, false, &report);

        // Data and event as names and a dictionary: for what needs no class.
        const CVRawEvent matched{"Matched", {{"match", {"Match", CVEventPropertyRequirement::required}}}};
        CVError error;
        if (!tracker_->pushDataEvent(std::make_shared<CVRawDataEvent>("Match", CVDictionary{{"title", title}}), {},
                                     &error)) {
            std::fprintf(stderr, "equalizer: %s\n", error.what());
        }
        tracker_->submitRawEvent(matched, false, &report);
    }

    [[nodiscard]] std::string summary() const override { return tally_->summary(); }

  private:
    static void report(const CVProcessEvent*, const CVError* error) {
        if (error) std::fprintf(stderr, "equalizer: not recorded: %s\n", error->what());
    }

    const std::shared_ptr<CVTracker> tracker_;
    const std::shared_ptr<Tally> tally_ = std::make_shared<Tally>();
    const CVEventClass presetChosen_{"PresetChosen", [] { return std::make_shared<PresetChosen>(); }};
};

}  // namespace

extern "C" [[gnu::visibility("default")]] void startPlugin(CVSessionManager& sessions,
                                                           std::shared_ptr<Plugin>& plugin) {
    plugin = std::make_shared<Equalizer>(sessions);
}
