#pragma once

#include <corvane/Export.h>
#include <corvane/Reflection/TypeName.h>

#include <string>
#include <string_view>
#include <typeindex>
#include <typeinfo>

namespace corvane {

/// A type as a value: what an event property asks for, what a stack holds. Compared by identity, printed by name.
class CORVANE_EXPORT DataType {
  public:
    template <class T>
    [[nodiscard]] CORVANE_LOCAL static DataType of() {
        return DataType(typeid(T), typeName<T>());
    }

    /// The type's unqualified name, in storage that lives as long as the program.
    [[nodiscard]] std::string_view name() const { return name_; }
    /// The whole name, namespaces included, as the compiler knows it: for messages.
    [[nodiscard]] std::string qualifiedName() const;

    friend bool operator==(const DataType& a, const DataType& b) { return a.type_ == b.type_; }

  private:
    DataType(const std::type_info& type, std::string_view name) : type_(type), name_(name) {}

    std::type_index type_;
    std::string_view name_;
};

}  // namespace corvane
