#include <corvane/Tracker/DataEventStacks.h>

#include <utility>

namespace corvane {

void DataEventStacks::push(AnyDataEventEntry entry) {
    const DataType type = entry.data.type();
    auto found = stacks_.find(entry.key);
    if (found == stacks_.end()) {
        found = stacks_.emplace(std::string(entry.key), DataEventStack(entry.key, type)).first;
    }
    // Goes last, when the stacks are whole again: the host's data may push when it is destroyed.
    std::optional<DataEventStack> replaced;
    if (found->second.type() != type) replaced = std::exchange(found->second, DataEventStack(entry.key, type));
    found->second.push(std::move(entry));
}

void DataEventStacks::pop(std::string_view key, DataType type) {
    const auto found = stacks_.find(key);
    if (found != stacks_.end() && found->second.type() == type) found->second.pop();
}

std::optional<AnyDataEvent> DataEventStacks::take(std::string_view key) {
    const auto found = stacks_.find(key);
    if (found == stacks_.end()) return std::nullopt;
    const AnyDataEventEntry* top = found->second.top();
    if (!top) return std::nullopt;
    std::optional<AnyDataEvent> data(top->data);
    if (top->traits.contains(DataEventTrait::onlyOnce)) found->second.pop();
    return data;
}

}  // namespace corvane
