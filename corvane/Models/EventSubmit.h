#pragma once

#include <corvane/Export.h>
#include <corvane/Models/Encodable.h>
#include <corvane/Models/EventProperty.h>
#include <corvane/Reflection/TypeName.h>

#include <concepts>
#include <memory>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <vector>

namespace corvane {

/// A declared property: its name and its declaration.
struct EventMirrorProperty {
    std::string name;
    std::shared_ptr<const EventPropertyType> eventProperty;
};

/// The properties of an event type in declaration order.
using EventMirrorProperties = std::shared_ptr<const std::vector<EventMirrorProperty>>;

class EventMirrorStore;

/// An event type: a record that can be made without arguments. Its fields that are property declarations are its
/// properties; fields of any other kind are ignored. Its name is its `typeName`.
template <class E>
concept EventType = std::is_class_v<E> && std::default_initializable<E> && Record<E>;

/// What an event is called and what it carries: what a submission needs to know of it, whatever it was declared by.
struct EventDeclaration {
    std::string_view name;
    EventMirrorProperties (*properties)(const EventDeclaration& self, EventMirrorStore& store);
};

namespace detail {
/// The properties under a name, read once for a store and then kept there.
CORVANE_EXPORT EventMirrorProperties storedProperties(EventMirrorStore& store, std::string_view eventName,
                                                      std::vector<EventMirrorProperty> (*mirror)());
/// Adds a property. Not in the header: a host would have the code of it for each of its declarations.
CORVANE_EXPORT void addProperty(std::vector<EventMirrorProperty>& properties, std::string_view name,
                                std::unique_ptr<const EventPropertyType> property);
}  // namespace detail

#pragma GCC visibility push(hidden)
namespace detail {

template <class D>
struct Declaration<EventProperty<D>> {
    static consteval auto search() {
        if constexpr (DataEventType<D>) {
            return searchDataEvent<Use::later, D>();
        } else {
            return NoFinding();  // never found, unless it was pushed by name
        }
    }
};

struct PropertyCollector {
    template <class T>
    CORVANE_LOCAL void operator()(std::string_view name, const T& field) const {
        if constexpr (std::derived_from<T, EventPropertyType>) {
            addProperty(properties, name, std::make_unique<const T>(field));
        }
    }
    std::vector<EventMirrorProperty>& properties;
};

template <class E>
std::vector<EventMirrorProperty> mirrorOf() {
    std::vector<EventMirrorProperty> properties;
    const E declarations{};
    forEachField(declarations, PropertyCollector{properties});
    return properties;
}

template <class E>
EventMirrorProperties propertiesOf(const EventDeclaration& self, EventMirrorStore& store) {
    return storedProperties(store, self.name, &mirrorOf<E>);
}

template <class E>
CORVANE_LOCAL inline constexpr EventDeclaration declarationOf{typeName<E>(), &propertiesOf<E>};

}  // namespace detail
#pragma GCC visibility pop

/// Names the event that is submitted or timed. A value of two words; copies share the declaration.
class EventSubmit {
  public:
    /// The event type `E`.
    template <class E>
    [[nodiscard]] CORVANE_LOCAL static EventSubmit actual() {
        if constexpr (detail::check(detail::searchEvent<E>())) {
            // The declaration is a constant of the program: nothing owns it.
            return EventSubmit({std::shared_ptr<void>(), &detail::declarationOf<E>});
        }
    }

    /// An event declared at run time.
    explicit EventSubmit(std::shared_ptr<const EventDeclaration> declaration) : declaration_(std::move(declaration)) {}

    [[nodiscard]] std::string_view name() const { return declaration_->name; }
    [[nodiscard]] EventMirrorProperties properties(EventMirrorStore& store) const {
        return declaration_->properties(*declaration_, store);
    }

  private:
    std::shared_ptr<const EventDeclaration> declaration_;
};

}  // namespace corvane
