#pragma once

namespace collector {

/// The files of page/, as they are compiled into the program.
extern const char* const pageHTML;
extern const char* const pageStyle;
extern const char* const pageScript;

}  // namespace collector
