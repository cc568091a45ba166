#pragma once

#include <corvane/Platform/Error.h>

#include <optional>
#include <utility>
#include <variant>

namespace corvane {

/// What became of a request to somebody else's server: a value or an error. A value type.
template <class Value>
struct [[nodiscard]] ExternalResult {
    struct Success {
        Value value;
    };
    struct Failed {
        AnyError error;
    };

    std::variant<Success, Failed> result;

    static ExternalResult success(Value value) { return {Success{std::move(value)}}; }
    static ExternalResult failed(AnyError error) { return {Failed{std::move(error)}}; }

    /// The value of a success, or nothing.
    [[nodiscard]] std::optional<Value> valueOrNil() const {
        if (const auto* success = std::get_if<Success>(&result)) return success->value;
        return std::nullopt;
    }
};

}  // namespace corvane
