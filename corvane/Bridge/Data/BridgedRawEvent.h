#pragma once

#include <corvane/Bridge/Data/BridgedDataEventClass.h>
#include <corvane/Bridge/Data/BridgedEventClass.h>
#include <corvane/Export.h>
#include <corvane/Models/EventSubmit.h>

#include <string>
#include <utility>
#include <vector>

namespace corvane {

/// A property of a raw event: the name of the data that fills it. Callers see it as `CVRawEventProperty`. A value.
class BridgedRawEventProperty {
  public:
    BridgedRawEventProperty(std::string dataName, BridgedEventPropertyRequirement requirement)
        : BridgedRawEventProperty(BridgedDataEventClass(std::move(dataName)), requirement) {}
    /// Filled by data of a class, which may be one of the library's own records. Data that is known by its name alone
    /// is none of these, whatever it is called.
    BridgedRawEventProperty(BridgedDataEventClass dataType, BridgedEventPropertyRequirement requirement)
        : dataType_(std::move(dataType)), requirement_(requirement) {}

    [[nodiscard]] const std::string& dataName() const { return dataType_.dataName(); }
    [[nodiscard]] const BridgedDataEventClass& dataType() const { return dataType_; }
    [[nodiscard]] BridgedEventPropertyRequirement requirement() const { return requirement_; }

  private:
    BridgedDataEventClass dataType_;
    BridgedEventPropertyRequirement requirement_;
};

/// An event that is nothing but its name and what it carries. Callers see it as `CVRawEvent`. Immutable; copies share
/// the declaration, so an event that is submitted often is best made once. May be read from any thread.
///
///     const CVRawEvent view{"ScreenView", {{"screen", {"Screen", CVEventPropertyRequirement::required}}}};
class CORVANE_EXPORT BridgedRawEvent {
  public:
    /// Property names with what fills them, in the order in which they stand in the event's JSON.
    using Properties = std::vector<std::pair<std::string, BridgedRawEventProperty>>;

    /// A name that is not UTF-8, a property that is declared twice, a requirement that is unknown: the event can be
    /// made all the same, and each use of it fails with the `BridgeError` that says so.
    BridgedRawEvent(std::string name, Properties properties);

    [[nodiscard]] const std::string& name() const;
    [[nodiscard]] const Properties& properties() const;

    /// The event as trackers take it.
    [[nodiscard]] EventSubmit eventSubmit() const;
    /// Throws what is wrong with the declaration, if anything is.
    void check() const;

  private:
    struct Declaration;
    std::shared_ptr<const Declaration> declaration_;
};

}  // namespace corvane
