#include <corvane/Tracker/DataEventStack.h>

#include <utility>

namespace corvane {

void DataEventStack::push(AnyDataEventEntry entry) {
    if (entry.traits.contains(DataEventTrait::unique)) entries_.clear();
    entries_.push_back(std::move(entry));
}

std::optional<AnyDataEventEntry> DataEventStack::pop() {
    if (entries_.empty()) return std::nullopt;
    std::optional<AnyDataEventEntry> entry(std::move(entries_.back()));
    entries_.pop_back();
    return entry;
}

}  // namespace corvane
