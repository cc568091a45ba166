#pragma once

#include <corvane/Platform/Date.h>

#include <string>

namespace corvane {

/// A stretch of activity, such as a flow through several screens. A value.
struct Group {
    std::string name;
    Date startDate;  ///< when the host called enterGroup
};

}  // namespace corvane
