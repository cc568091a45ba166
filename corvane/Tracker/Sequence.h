#pragma once

#include <corvane/Models/DataEvent.h>

#include <string_view>
#include <vector>

namespace corvane {

/// A property of an event with the data that fills it. The name is the declaration's, which must outlive the entry.
struct SequenceEntry {
    std::string_view name;
    AnyDataEvent data;
};

/// A resolved event: its entries in declaration order.
struct Sequence {
    std::vector<SequenceEntry> entries;
};

/// The event's JSON: one object, flat at its top, with the object of each entry under the entry's name. Of two entries
/// of one name the later one counts. Throws what `toDict` of an entry throws; an `EncodingError` names the property.
[[nodiscard]] JSON encode(const Sequence& sequence);

}  // namespace corvane
