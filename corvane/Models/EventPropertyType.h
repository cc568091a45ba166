#pragma once

#include <corvane/Export.h>
#include <corvane/Reflection/DataType.h>

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

}  // namespace corvane
