#include "CommandLine.h"

#include <charconv>

namespace examples {

CommandLine::CommandLine(int argc, const char* const* argv, const std::set<std::string_view>& options) {
    bool optionsEnded = false;
    for (int i = 1; i < argc; ++i) {
        const std::string argument = argv[i];
        if (optionsEnded || argument == "-" || !argument.starts_with('-')) {
            operands_.push_back(argument);
            continue;
        }
        if (argument == "--") {
            optionsEnded = true;
            continue;
        }
        if (argument == "--help") {
            wantsHelp_ = true;
            continue;
        }
        const std::size_t equals = argument.find('=');
        const std::string name = argument.substr(0, equals);
        if (!options.contains(name)) throw UsageError("unknown option " + name);
        if (equals == std::string::npos && i + 1 == argc) throw UsageError(name + " needs a value");
        const std::string value = equals == std::string::npos ? argv[++i] : argument.substr(equals + 1);
        if (!values_.emplace(name, value).second) throw UsageError(name + " is given twice");
    }
}

std::optional<std::string> CommandLine::value(std::string_view option) const {
    const auto found = values_.find(option);
    return found == values_.end() ? std::nullopt : std::optional(found->second);
}

std::int64_t CommandLine::number(std::string_view option, std::int64_t otherwise, std::int64_t least,
                                 std::int64_t most) const {
    const auto text = value(option);
    if (!text) return otherwise;
    std::int64_t number = 0;
    const char* const end = text->data() + text->size();
    const auto [rest, error] = std::from_chars(text->data(), end, number);
    if (error != std::errc() || rest != end || number < least || number > most) {
        throw UsageError(std::string(option) + " takes a whole number from " + std::to_string(least) + " to " +
                         std::to_string(most));
    }
    return number;
}

}  // namespace examples
