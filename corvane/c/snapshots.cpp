// Snapshots of the data in scope.

#include <corvane/c/Call.h>
#include <corvane/c/Event.h>
#include <corvane/c/Sessions.h>
#include <corvane/c/corvane.h>

#include <utility>

using namespace corvane;
using namespace corvane::c;

namespace {

class SnapshotObject final : public Object {
  public:
    static constexpr Kind kind = Kind::snapshot;

    explicit SnapshotObject(std::shared_ptr<const SnapshotType> given) : snapshot(std::move(given)) {}

    const std::shared_ptr<const SnapshotType> snapshot;
};

class Evaluation final : public Object {
  public:
    static constexpr Kind kind = Kind::evaluation;

    explicit Evaluation(const SnapshotEvent& event) : isValid(event.isValid) {
        for (const auto& entry : event.entries) {
            properties.push_back({.name = entry.name, .json = entry.dataEntry.data.toDict().text()});
        }
        for (const auto& missing : event.missingData) {
            properties.push_back({.name = missing.key(), .isOptional = missing.isOptional(), .isMissing = true});
        }
    }

    struct Property {
        std::string name;
        bool isOptional = false;
        bool isMissing = false;
        std::string json = {};
    };

    const bool isValid;
    std::vector<Property> properties;  // not changed any more
};

SnapshotPolicy policyOf(std::int32_t policy) {
    if (policy == CORVANE_SNAPSHOT_NOW) return SnapshotPolicy::now;
    if (policy == CORVANE_SNAPSHOT_ALL) return SnapshotPolicy::all;
    refuse(CORVANE_INVALID_ARGUMENT, "the policy of a snapshot is unknown");
}

}  // namespace

corvane_snapshot* corvane_tracker_snapshot(corvane_tracker* tracker, int32_t policy, corvane_error* error) {
    return call(error, [&] {
        const Used<TrackerObject> used(tracker);
        requireMayWait();
        return static_cast<corvane_snapshot*>(
            make<SnapshotObject>(used->tracker->tracker()->snapshot(policyOf(policy))));
    });
}

corvane_evaluation* corvane_snapshot_evaluate(corvane_snapshot* snapshot, corvane_event* event, corvane_error* error) {
    return call(error, [&] {
        const Used<SnapshotObject> used(snapshot);
        const auto declared = Used<Event>(event)->use();
        return static_cast<corvane_evaluation*>(make<Evaluation>(used->snapshot->evaluate(declared.eventSubmit())));
    });
}

bool corvane_evaluation_is_valid(corvane_evaluation* evaluation, corvane_error* error) {
    return call(error, [&] { return Used<Evaluation>(evaluation)->isValid; });
}

bool corvane_evaluation_property(corvane_evaluation* evaluation, size_t index, corvane_evaluated* property,
                                 corvane_error* error) {
    return call(error, [&] {
        const Used<Evaluation> used(evaluation);
        if (index >= used->properties.size()) return false;
        const auto& found = used->properties[index];
        write(property,
              {.size = sizeof(corvane_evaluated),
               .property = found.name.c_str(),
               .is_optional = found.isOptional,
               .is_missing = found.isMissing,
               .json = found.isMissing ? nullptr : found.json.c_str()},
              "the property");
        return true;
    });
}
