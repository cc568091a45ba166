#pragma once

#include "Directory.h"
#include "Payload.h"
#include "Table.h"

#include <ostream>
#include <string>

namespace inspect {

// What the commands print: tables for people, or with `json` one JSON object for programs, whose keys are those of the
// manual page and stay.

void printStatus(std::ostream& out, const Directory& directory, const Style& style);
[[nodiscard]] std::string statusJSON(const Directory& directory);

/// A row for each document, or only a count of those beyond `most`.
void printDocuments(std::ostream& out, const Directory& directory, const Style& style, std::size_t most);

void printAgent(std::ostream& out, const Directory& directory, const Style& style);
[[nodiscard]] std::string agentJSON(const Directory& directory);

void printChecks(std::ostream& out, const std::string& name, const Payload& payload, const Style& style);
[[nodiscard]] std::string checksJSON(const std::string& name, const Payload& payload);

void printProblems(std::ostream& out, const Directory& directory, const Style& style);

}  // namespace inspect
