#include "tail.h"

#include "Directory.h"
#include "text.h"

#include <chrono>
#include <ctime>
#include <map>
#include <set>
#include <string>
#include <thread>

namespace inspect {

namespace {

// What is told of, by its name: a document's state, a ledger's totals.
using Facts = std::map<std::string, std::string>;

Facts factsOf(const Directory& directory) {
    Facts facts;
    const bool runs = directory.agent.process.has_value();
    facts["recording"] = directory.isRecording ? "on" : "off";
    facts["agent"] = runs ? "runs" : "does not run";
    for (const auto& endpoint : directory.endpoints) {
        const std::string name = printable(endpoint.name);
        for (const auto& [entry, total] : endpoint.ledger) {
            facts[name + ": " + printable(entry)] = counted(static_cast<std::uint64_t>(total.events), "event") +
                                                    " in " +
                                                    counted(static_cast<std::uint64_t>(total.documents), "document");
        }
        std::int64_t open = 0;
        for (const auto& batch : endpoint.batches) open += batch.events;
        facts[name + ": open"] = counted(static_cast<std::uint64_t>(open), "event");
        for (const auto& document : endpoint.documents) {
            facts[name + ": document " + printable(document.identifier)] =
                counted(static_cast<std::uint64_t>(document.events), "event") + ", " +
                (document.task ? document.task->state(runs) : document.state(directory.isRecording));
        }
    }
    for (const auto& problem : directory.problems) facts["problem"] = printable(problem);
    return facts;
}

std::string timeOfDay() {
    const std::time_t now = std::time(nullptr);
    std::tm local{};
    ::localtime_r(&now, &local);
    char text[16] = "";
    std::strftime(text, sizeof text, "%H:%M:%S", &local);
    return text;
}

}  // namespace

void tail(std::ostream& out, const std::filesystem::path& path) {
    Facts known;
    while (out) {
        auto facts = factsOf(Directory::read(path));
        for (const auto& [name, fact] : facts) {
            const auto found = known.find(name);
            if (found == known.end() || found->second != fact)
                out << timeOfDay() << "  " << name << ": " << fact << "\n";
        }
        for (const auto& [name, fact] : known) {
            if (!facts.contains(name)) out << timeOfDay() << "  " << name << ": over\n";
        }
        out.flush();
        known = std::move(facts);
        std::this_thread::sleep_for(std::chrono::milliseconds(500));
    }
}

}  // namespace inspect
