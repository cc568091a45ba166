#pragma once

#include <corvane/Store/StorableValue.h>
#include <corvane/Store/StoreColumn.h>
#include <corvane/Store/StoreStepper.h>

#include <concepts>
#include <cstdint>
#include <string_view>
#include <vector>

namespace corvane {

/// An entity type whose records a `Store` can keep:
///
///     struct Note {
///         static constexpr std::string_view tableName = "notes";
///         static constexpr std::int64_t schemaVersion = 1;   // a change drops the table: there are no migrations
///         static std::vector<StoreColumn> columns();         // in table order
///         StorableValue storableValue(std::string_view columnName) const;
///         static Note read(StoreStepper& stepper);           // reads the columns in table order; may throw
///         static StoreTableExtras extras();                // optional
///     };
template <class Entity>
concept Storable = requires(const Entity& entity, std::string_view columnName, StoreStepper& stepper) {
    { Entity::tableName } -> std::convertible_to<std::string_view>;
    { Entity::schemaVersion } -> std::convertible_to<std::int64_t>;
    { Entity::columns() } -> std::convertible_to<std::vector<StoreColumn>>;
    { entity.storableValue(columnName) } -> std::same_as<StorableValue>;
    { Entity::read(stepper) } -> std::same_as<Entity>;
};

}  // namespace corvane
