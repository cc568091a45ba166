#include <corvane/Snapshot/Snapshot.h>

#include <corvane/Models/EventData.h>

#include <utility>

namespace corvane {

namespace {

AnyDataEventEntry spanEntry(std::string_view property, const TimedData& span) {
    // The place is this one, without the path of the machine that compiled it.
    return {property, AnyDataEvent(span), {}, "corvane/Snapshot/Snapshot.cpp", __LINE__};
}

}  // namespace

Snapshot::Snapshot(SnapshotPolicy policy, std::vector<SnapshotLevel> levels,
                   std::shared_ptr<EventMirrorStore> mirrorStore)
    : policy_(policy), levels_(std::move(levels)), eventMirrorStore_(std::move(mirrorStore)) {}
Snapshot::~Snapshot() = default;

SnapshotEvent Snapshot::evaluate(const EventSubmit& event) const {
    using MissingData = SnapshotEvent::MissingData;
    const Date evaluationTime = now();
    SnapshotEvent result;
    result.properties = event.properties(*eventMirrorStore_);
    for (const auto& [name, property] : *result.properties) {
        const bool isSpan = !property->isOptional() && property->trait() == EventPropertyTrait::data &&
                            property->isDataType(DataType::of<TimedData>());
        if (isSpan && !levels_.empty()) {
            const auto timer = levels_.front().timers.find(event.name());
            if (timer != levels_.front().timers.end()) {
                result.entries.push_back({name, spanEntry(name, TimedData(timer->second.startTime, evaluationTime))});
                continue;
            }
        }
        if (const AnyDataEventEntry* entry = lookup(property->dataKey())) {
            result.entries.push_back({name, *entry});
        } else if (property->isOptional()) {
            result.missingData.push_back(MissingData::optional(name, property->dataType()));
        } else {
            result.missingData.push_back(MissingData::required(name, property->dataType()));
            result.isValid = false;
        }
    }
    return result;
}

const AnyDataEventEntry* Snapshot::lookup(std::string_view key) const {
    for (const SnapshotLevel& level : levels_) {
        if (const auto found = level.entries.find(key); found != level.entries.end()) return &found->second.front();
    }
    return nullptr;
}

}  // namespace corvane
