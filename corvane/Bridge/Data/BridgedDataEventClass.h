#pragma once

#include <corvane/Bridge/Models/BridgedDataEventType.h>
#include <corvane/Export.h>
#include <corvane/Reflection/DataType.h>

#include <string>

namespace corvane {

/// A data event that is nothing but its name and a dictionary. Callers see it as `CVRawDataEvent`. Immutable.
///
///     tracker.pushDataEvent(std::make_shared<CVRawDataEvent>("Screen", CVDictionary{{"name", "home"}}));
class CORVANE_EXPORT BridgedRawDataEvent final : public BridgedDataEventType {
  public:
    BridgedRawDataEvent(std::string name, HostValue::Dictionary dictionary);
    BridgedRawDataEvent(const BridgedRawDataEvent&) = default;
    ~BridgedRawDataEvent() override;

    [[nodiscard]] const std::string& name() const { return name_; }
    [[nodiscard]] const HostValue::Dictionary& dictionary() const { return dictionary_; }

    [[nodiscard]] std::string dataName() const override { return name_; }
    [[nodiscard]] HostValue::Dictionary toDict() const override { return dictionary_; }

  private:
    const std::string name_;
    const HostValue::Dictionary dictionary_;
};

/// A class of data events as an object: what event classes ask for and what is popped. Callers see it as
/// `CVDataEventClass`. A value.
///
///     const CVDataEventClass screen{"Screen"};
///
/// The library's own records have theirs, `CVEventData::dataClass()` and `CVTimedData::dataClass()`: an event class
/// that requires one of these gets what the tracker knows of the event. A class that merely has the same name does not.
class CORVANE_EXPORT BridgedDataEventClass {
  public:
    explicit BridgedDataEventClass(std::string dataName);

    /// The key under which data events of the class are filed and found.
    [[nodiscard]] const std::string& dataName() const { return dataName_; }

  private:
    friend class BridgedEventData;
    friend class BridgedTimedData;
    friend class BridgedEventMirrorProperty;
    friend class BridgedRawEventMirrorProperty;

    BridgedDataEventClass(std::string dataName, DataType type);

    std::string dataName_;
    DataType type_;  // the library's type behind the class
};

}  // namespace corvane
