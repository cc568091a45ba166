#pragma once

#include <optional>
#include <string>

namespace corvane {

/// Where a store keeps its table: in a database file of the documents directory, or in memory. A value.
class StoreLocation {
  public:
    /// The database file named after `name`; surrounding white space and capitals make no difference. A name that no
    /// file can have is found out when the store is opened.
    [[nodiscard]] static StoreLocation default_(std::string name);
    /// A private database that lives as long as its store.
    [[nodiscard]] static StoreLocation memory();

    [[nodiscard]] bool isMemory() const noexcept { return !name_; }
    /// The name of a file location; nothing for memory.
    [[nodiscard]] const std::optional<std::string>& name() const noexcept { return name_; }
    /// The location as an error message prints it.
    [[nodiscard]] std::string description() const;

    bool operator==(const StoreLocation&) const = default;

  private:
    explicit StoreLocation(std::optional<std::string> name);

    std::optional<std::string> name_;
};

}  // namespace corvane
