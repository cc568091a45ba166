#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <set>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace examples {

/// The command line does not make sense; the message says why.
class UsageError : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

/// A program's arguments: options, each with a value ("--port 80" or "--port=80"), and operands. "--" ends the
/// options, "-" is an operand, and "--help" is known to every program.
class CommandLine {
  public:
    /// @param options the names that the program knows, with their dashes
    /// Throws `UsageError` for any other option, one without a value, and one that is given twice.
    CommandLine(int argc, const char* const* argv, const std::set<std::string_view>& options);

    [[nodiscard]] bool wantsHelp() const { return wantsHelp_; }
    [[nodiscard]] const std::vector<std::string>& operands() const { return operands_; }
    [[nodiscard]] std::optional<std::string> value(std::string_view option) const;
    /// A whole number from `least` to `most`; `otherwise` when the option is not given. Throws `UsageError`.
    [[nodiscard]] std::int64_t number(std::string_view option, std::int64_t otherwise, std::int64_t least,
                                      std::int64_t most) const;

  private:
    bool wantsHelp_ = false;
    std::map<std::string, std::string, std::less<>> values_;
    std::vector<std::string> operands_;
};

}  // namespace examples
