#pragma once

#include "benchmarks/Table.h"

#include <string>

namespace corvane::bench {

/// Documents of 50 events compressed, signed and sent, one after the other, with kept state.
/// @param survives write the compressed document to a file and a row to a database first, and remove both afterwards,
///                 as whoever wants to send it again after a crash must.
Figures bareDocuments(const std::string& url, bool survives);

}  // namespace corvane::bench
