#pragma once

#include "Directory.h"

#include <string>

namespace inspect {

/// Sends one stored document as its host would, but for the headers that a host adds itself, and returns the status of
/// the answer with its first line, for people. Nothing that is stored changes: its host sends it, too.
/// Throws `Problem` when it cannot be sent or nobody answers.
[[nodiscard]] std::string send(const Directory& directory, const Document& document, const std::string& url,
                               bool& isAccepted);

}  // namespace inspect
