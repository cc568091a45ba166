#pragma once

#include <corvane/Export.h>
#include <corvane/Models/JSON.h>

#include <concepts>
#include <optional>
#include <string>
#include <string_view>

namespace corvane {

/// Anything that can be serialised as an upload document: `payload` gives a JSON object or throws.
template <class T>
concept Uploadable = requires(const T& value) {
    { value.payload() } -> std::same_as<JSON>;
};

/// The finished form of a submitted event: what processors receive and a session keeps. A value whose copies share
/// the JSON.
class CORVANE_EXPORT ProcessEvent {
  public:
    ProcessEvent(std::string name, JSON json, std::optional<std::string> groupName);

    /// The event's name.
    [[nodiscard]] const std::string& name() const { return name_; }
    /// An object with one key per property that was filled.
    [[nodiscard]] const JSON& json() const { return json_; }
    /// The format version of events: "0.1.0".
    [[nodiscard]] static std::string_view version() { return "0.1.0"; }
    /// The innermost group the submitting tracker was in, or nothing.
    [[nodiscard]] const std::optional<std::string>& groupName() const { return groupName_; }

    /// The event as it stands in an upload document: "data" with the JSON, "metadata" with "name" and "version".
    /// Throws `JSONError` when the JSON is not an object, also for text that claims to be one, and `EncodingError` when
    /// it nests too deep.
    [[nodiscard]] JSON payload() const;

  private:
    std::string name_;
    JSON json_;
    std::optional<std::string> groupName_;
};

/// For hosts' own use; the library does not raise it.
enum class ProcessError {
    jsonError,  ///< an event's JSON is not usable
};

}  // namespace corvane
