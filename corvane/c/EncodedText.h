#pragma once

// Internal.

#include <corvane/Models/JSON.h>

namespace corvane::c {

/// The object in a JSON text of the host's, as the library itself would have written it: without blanks, numbers in
/// their shortest form, and of two members of one name the later one. Throws when it is none.
[[nodiscard]] JSON encodedObject(const char* json);

}  // namespace corvane::c
