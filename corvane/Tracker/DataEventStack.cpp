#include <corvane/Tracker/DataEventStack.h>

#include <utility>

namespace corvane {

void DataEventStack::push(AnyDataEventEntry entry) {
    // The host's data may push when it is destroyed, so what is replaced goes when the stack is whole again.
    std::vector<AnyDataEventEntry> replaced;
    if (entry.traits.contains(DataEventTrait::unique)) replaced.swap(entries_);
    entries_.push_back(std::move(entry));
}

std::optional<AnyDataEventEntry> DataEventStack::pop() {
    if (entries_.empty()) return std::nullopt;
    std::optional<AnyDataEventEntry> entry(std::move(entries_.back()));
    entries_.pop_back();
    return entry;
}

}  // namespace corvane
