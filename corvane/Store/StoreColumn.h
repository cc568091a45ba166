#pragma once

#include <string>

namespace corvane {

/// One column of a table. A value; name and type go into statements as they stand, so they are constants of the code
/// and never data.
struct StoreColumn {
    std::string name;
    std::string type;       ///< the declared SQL type, such as "TEXT"
    bool nullable = false;  ///< whether the column may hold NULL
    bool primary = false;   ///< whether it is the table's key
};

}  // namespace corvane
