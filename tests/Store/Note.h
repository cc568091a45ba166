#pragma once

#include <corvane/Store/Store.h>

#include <optional>
#include <string>
#include <vector>

namespace corvane::test {

/// An entity with one column of every kind.
struct Note {
    static constexpr std::string_view tableName = "notes";
    static constexpr std::int64_t schemaVersion = 3;
    static std::vector<StoreColumn> columns() {
        return {{"identifier", "TEXT", false, true},
                {"count", "INTEGER", false, false},
                {"weight", "DOUBLE", false, false},
                {"body", "DATA", true, false},
                {"remark", "TEXT", true, false}};
    }
    static Note read(StoreStepper& stepper) {
        Note note;
        note.identifier = stepper.text();
        note.count = stepper.integer();
        note.weight = stepper.double_();
        note.body = stepper.bytes();
        note.remark = stepper.optionalText();
        return note;
    }
    [[nodiscard]] StorableValue storableValue(std::string_view column) const {
        if (column == "identifier") return identifier;
        if (column == "count") return count;
        if (column == "weight") return weight;
        if (column == "body") return body.empty() ? StorableValue::absent() : StorableValue::bytes(body);
        return remark;
    }
    bool operator==(const Note&) const = default;

    std::string identifier;
    std::int64_t count = 0;
    double weight = 0;
    std::string body = "-";
    std::optional<std::string> remark = std::nullopt;
};

}  // namespace corvane::test
