#pragma once

#include <corvane/Export.h>
#include <corvane/Reflection/DataType.h>

#include <string>

namespace corvane {

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

    BridgedDataEventClass(std::string dataName, DataType type);

    std::string dataName_;
    DataType type_;  // the library's type behind the class
};

}  // namespace corvane
