#pragma once

#include <corvane/Models/DataEventTrait.h>

namespace corvane {

/// How a pushed data event behaves on its stack. Callers see it as `CVDataEventTraits`. A value.
struct BridgedDataEventTraits {
    bool onlyOnce = false;  ///< it leaves the stack with the first event that finds it
    bool unique = false;    ///< it takes the place of everything on the stack

    /// The same traits as the library's.
    [[nodiscard]] DataEventTraits traits() const {
        if (onlyOnce && unique) return {DataEventTrait::onlyOnce, DataEventTrait::unique};
        if (onlyOnce) return {DataEventTrait::onlyOnce};
        return unique ? DataEventTraits{DataEventTrait::unique} : DataEventTraits{};
    }
};

}  // namespace corvane
