#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace collector {

/// Decompresses one whole gzip member that is all of `bytes`. Throws `Refusal` (400) for anything else, and (413) when
/// the contents are larger than `most`.
[[nodiscard]] std::string gunzip(std::string_view bytes, std::size_t most);

}  // namespace collector
