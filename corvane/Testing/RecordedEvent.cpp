#include <corvane/Testing/RecordedEvent.h>

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <optional>
#include <ostream>
#include <stdexcept>
#include <system_error>
#include <variant>

namespace corvane::test {

namespace {

std::optional<double> asDouble(const JSON& json) {
    const auto number = json.number();
    if (!number || std::holds_alternative<bool>(*number)) return std::nullopt;
    return std::visit([](auto value) { return static_cast<double>(value); }, *number);
}

}  // namespace

JSON valueAt(const JSON& json, std::string_view path) {
    if (path.empty()) return JSON("");
    const auto dot = path.find('.');
    const auto step = path.substr(0, dot);
    JSON value = json[step];
    std::int64_t index = 0;
    const auto [end, error] = std::from_chars(step.data(), step.data() + step.size(), index);
    if (json.array() && error == std::errc() && end == step.data() + step.size()) value = json[index];
    return dot == std::string_view::npos ? value : valueAt(value, path.substr(dot + 1));
}

bool FieldValue::equals(const JSON& field) const {
    if (const auto expected = asDouble(json_), found = asDouble(field); expected && found) {
        const bool areWhole = json_.integer() && field.integer();  // which a double may not tell apart
        return areWhole ? json_.integer() == field.integer() : expected == found;
    }
    if (json_.string()) return json_.string() == field.string();  // escapes may be spelled in several ways
    return field.exists() && json_.text() == field.text();
}

JSON RecordedEvent::at(std::string_view path) const {
    JSON value = valueAt(json(), path);
    if (!value.exists()) throw std::out_of_range("nothing at \"" + std::string(path) + "\" of " + description());
    return value;
}

bool RecordedEvent::has(const std::vector<ExpectedField>& fields) const {
    return std::all_of(fields.begin(), fields.end(),
                       [this](const auto& field) { return field.value.equals(valueAt(json(), field.path)); });
}

std::string RecordedEvent::description() const {
    return name() + " " + json().text();
}

std::ostream& operator<<(std::ostream& out, const RecordedEvent& event) {
    return out << event.description();
}

}  // namespace corvane::test
