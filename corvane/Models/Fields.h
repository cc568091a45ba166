#pragma once

#include <corvane/Export.h>
#include <corvane/Reflection/Reflection.h>

#include <string_view>
#include <tuple>
#include <utility>

namespace corvane {

/// One field of a type that reflection cannot take apart: its name and a pointer to the member.
template <class Class, class Member>
struct Field {
    std::string_view name;
    Member Class::*member;
};

template <class Class, class Member>
Field(std::string_view, Member Class::*) -> Field<Class, Member>;

/// The descriptor of a type that reflection cannot take apart, because it has private members, bases, arrays or more
/// than 64 fields. Such a type spells its fields once, in declaration order, in a static member function:
///
///     class Viewer {
///         std::string id_;
///         int age_ = 0;
///       public:
///         static constexpr auto corvaneFields() {
///             return std::tuple{corvane::Field{"id", &Viewer::id_}, corvane::Field{"age", &Viewer::age_}};
///         }
///     };
///
/// For a type that is not the host's to change, the host specialises `corvane::FieldsOf<Type>` with the same static
/// member function.
template <class T>
struct FieldsOf {};

template <class T>
requires requires {
    T::corvaneFields();
}
struct FieldsOf<T> {
    static constexpr auto corvaneFields() { return T::corvaneFields(); }
};

/// A type whose fields are spelt out in a descriptor.
template <class T>
concept Described = requires {
    FieldsOf<T>::corvaneFields();
};

/// A type whose fields are known, by descriptor or by reflection.
template <class T>
concept Record = Described<std::remove_cv_t<T>> || reflection::Reflectable<std::remove_cv_t<T>>;

/// Calls `visitor(name, field)` for each field of a record in declaration order.
template <class T, class Visitor>
requires Record<T> CORVANE_LOCAL constexpr void forEachField(T& value, Visitor&& visitor) {
    using Type = std::remove_cv_t<T>;
    if constexpr (Described<Type>) {
        std::apply([&](const auto&... field) { (visitor(field.name, value.*field.member), ...); },
                   FieldsOf<Type>::corvaneFields());
    } else {
        reflection::forEachField(value, visitor);
    }
}

}  // namespace corvane
