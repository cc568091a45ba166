#pragma once

#include <corvane/Models/AnyDataEventEntry.h>

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace corvane {

/// The data events of one type under one key, newest last. Belongs to a tracker or to the session manager and is used
/// on their queue.
///
/// One class serves every data type: the entries are held by reference, so a stack needs to know its type only to tell
/// a push of another type under the same key.
class DataEventStack {
  public:
    DataEventStack(std::string_view stackKey, DataType type) : stackKey_(stackKey), type_(type) {}

    [[nodiscard]] const std::string& stackKey() const { return stackKey_; }
    [[nodiscard]] DataType type() const { return type_; }
    [[nodiscard]] bool isEmpty() const { return entries_.empty(); }
    /// Oldest first.
    [[nodiscard]] const std::vector<AnyDataEventEntry>& entries() const { return entries_; }
    /// The newest entry, or nullptr. Good until the stack changes.
    [[nodiscard]] const AnyDataEventEntry* top() const { return entries_.empty() ? nullptr : &entries_.back(); }

    /// Puts an entry on top; with the trait `unique` in place of all others.
    void push(AnyDataEventEntry entry);
    /// Removes the newest entry and returns it, or does nothing.
    std::optional<AnyDataEventEntry> pop();

  private:
    std::string stackKey_;  // its own: the entry that brought the key may be gone
    DataType type_;
    std::vector<AnyDataEventEntry> entries_;
};

}  // namespace corvane
