#pragma once

#include <ostream>
#include <string>
#include <vector>

namespace inspect {

/// How the output looks.
struct Style {
    bool hasColours = false;
    std::size_t columns = 0;  ///< of the terminal; 0 for none, and then nothing is cut

    /// A heading.
    [[nodiscard]] std::string strong(const std::string& text) const;
    /// What needs attention.
    [[nodiscard]] std::string alarming(const std::string& text) const;
    /// For the standard output. Throws `std::invalid_argument` unless it is "auto", "always" or "never".
    [[nodiscard]] static Style of(const std::string& colours);
};

/// Rows of printable text in columns. The last one is cut where a terminal ends.
class Table {
  public:
    struct Column {
        std::string heading;
        bool isNumber = false;  ///< to the right
    };

    explicit Table(std::vector<Column> columns) : columns_(std::move(columns)) {}
    void add(std::vector<std::string> row) { rows_.push_back(std::move(row)); }
    void print(std::ostream& out, const Style& style) const;

  private:
    const std::vector<Column> columns_;
    std::vector<std::vector<std::string>> rows_;
};

}  // namespace inspect
