#pragma once

#include <corvane/Export.h>
#include <corvane/Models/DataEvent.h>
#include <corvane/Reflection/DataType.h>

#include <functional>
#include <string_view>

namespace corvane {

/// Whether an event can do without a property.
enum class EventPropertyRequirement {
    required,  ///< the submission fails without data
    optional,  ///< the property is left out without data
};

/// What a declared property asks for.
enum class EventPropertyTrait {
    data,   ///< a data event
    basic,  ///< something that is not a data event, and so never found
};

/// One property declaration of an event type. `EventProperty` is the one that hosts use. Immutable.
class CORVANE_EXPORT EventPropertyType {
  public:
    virtual ~EventPropertyType() = default;

    /// The key under which the data is looked up on the stacks. Lives as long as the declaration.
    [[nodiscard]] virtual std::string_view dataKey() const = 0;
    [[nodiscard]] virtual bool isOptional() const = 0;
    [[nodiscard]] virtual EventPropertyTrait trait() const = 0;
    [[nodiscard]] virtual DataType dataType() const = 0;
    /// Whether the declared type is `type`.
    [[nodiscard]] virtual bool isDataType(DataType type) const = 0;

  protected:
    EventPropertyType() = default;
    EventPropertyType(const EventPropertyType&) = default;
    EventPropertyType& operator=(const EventPropertyType&) = default;
};

/// The two values of a property declaration, as a host writes them: `EventProperty<Screen> screen = required;`. A host
/// that also imports the names of `std` writes `EventProperty<Screen>::optional`, which is not ambiguous.
inline constexpr EventPropertyRequirement required = EventPropertyRequirement::required;
inline constexpr EventPropertyRequirement optional = EventPropertyRequirement::optional;

/// Declares that an event type carries data of type `D`. The field's name is the property's name in the event's JSON.
template <class D>
class EventProperty final : public EventPropertyType {
  public:
    CORVANE_LOCAL static const EventProperty required;
    CORVANE_LOCAL static const EventProperty optional;

    CORVANE_LOCAL EventProperty(
        EventPropertyRequirement requirement)  // NOLINT(google-explicit-constructor): declarations read so
        : requirement_(requirement) {}

    [[nodiscard]] CORVANE_LOCAL std::string_view dataKey() const override { return typeName<D>(); }
    [[nodiscard]] CORVANE_LOCAL bool isOptional() const override {
        return requirement_ == EventPropertyRequirement::optional;
    }
    [[nodiscard]] CORVANE_LOCAL EventPropertyTrait trait() const override {
        return DataEventType<D> ? EventPropertyTrait::data : EventPropertyTrait::basic;
    }
    [[nodiscard]] CORVANE_LOCAL DataType dataType() const override { return DataType::of<D>(); }
    [[nodiscard]] CORVANE_LOCAL bool isDataType(DataType type) const override { return type == DataType::of<D>(); }

    friend bool operator==(const EventProperty& a, const EventProperty& b) { return a.requirement_ == b.requirement_; }

  private:
    EventPropertyRequirement requirement_;
};

template <class D>
inline const EventProperty<D> EventProperty<D>::required{EventPropertyRequirement::required};
template <class D>
inline const EventProperty<D> EventProperty<D>::optional{EventPropertyRequirement::optional};

}  // namespace corvane

template <class D>
struct std::hash<corvane::EventProperty<D>> {
    std::size_t operator()(const corvane::EventProperty<D>& property) const noexcept { return property.isOptional(); }
};
