#pragma once

#include <corvane/Tracker/DataEventStack.h>

#include <map>
#include <optional>
#include <string>
#include <string_view>

namespace corvane {

/// The stacks of one owner, at most one per key. Not thread-safe: it lives on its owner's queue.
class DataEventStacks {
  public:
    using Map = std::map<std::string, DataEventStack, std::less<>>;

    /// Files `entry` under its key. A stack of another type under that key is replaced, and its entries are lost.
    void push(AnyDataEventEntry entry);
    /// Removes the newest entry under `key` if the stack holds `type`; otherwise does nothing. The stack stays.
    void pop(std::string_view key, DataType type);
    /// The newest data under `key`, or nothing. An entry with the trait `onlyOnce` is removed.
    [[nodiscard]] std::optional<AnyDataEvent> take(std::string_view key);

    /// In ascending order of the keys.
    [[nodiscard]] Map& all() { return stacks_; }
    [[nodiscard]] const Map& all() const { return stacks_; }

  private:
    Map stacks_;
};

}  // namespace corvane
