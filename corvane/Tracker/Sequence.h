#pragma once

#include <corvane/Models/DataEvent.h>
#include <corvane/Tracker/EventIdentity.h>

#include <boost/container/small_vector.hpp>

#include <memory>
#include <optional>
#include <string_view>

namespace corvane {

/// A property of an event with the data that fills it. The name is the declaration's, which must outlive the entry.
struct SequenceEntry {
    std::string_view name;
    std::optional<AnyDataEvent> data;  ///< nothing stands for the event's own identity
};

/// A resolved event: its entries in declaration order.
struct Sequence {
    boost::container::small_vector<SequenceEntry, 8> entries;
    std::shared_ptr<const EventIdentity> identity;  ///< where an entry stands for it
    Date submitTime;
};

/// The event's JSON: one object, flat at its top, with the object of each entry under the entry's name. Of two entries
/// of one name the later one counts. Throws what `toDict` of an entry throws; an `EncodingError` names the property.
[[nodiscard]] JSON encode(const Sequence& sequence);

}  // namespace corvane
