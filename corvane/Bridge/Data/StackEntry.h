#pragma once

// Internal: what object-facing callers push, as the library's stacks take it. Never included by a public header.

#include <corvane/Bridge/Data/BridgedTracker.h>
#include <corvane/Bridge/Models/BridgedDataEventType.h>
#include <corvane/Bridge/Models/BridgedSession.h>
#include <corvane/Tracker/DataEventStack.h>
#include <corvane/Tracker/EventSubmitResult.h>

#include <cstdint>
#include <memory>
#include <optional>
#include <string>

namespace corvane::bridge {

/// Where data was pushed: text that lives as long as the program, or a script's file, which is kept with the data.
struct Place {
    const char* file = "";
    std::optional<std::string> ownFile = std::nullopt;
    std::uint_least32_t line = 0;
};

/// An entry for a tracker's stack, asked for here and now: the host's objects are asked on the caller's thread, and
/// never again. Throws `BridgeError` when there is no data or its name cannot be used. Data that cannot become JSON
/// gives an entry all the same, with its error in `failure`: it takes its place on the stack and fails the events that
/// find it, as typed data does, since events must not go out with the data that it was to hide.
[[nodiscard]] AnyDataEventEntry stackEntry(const std::shared_ptr<const BridgedDataEventType>& data,
                                           BridgedDataEventTraits traits, Place place,
                                           std::optional<AnyError>& failure);
/// The same for data that is encoded already. Throws when it is not an object.
[[nodiscard]] AnyDataEventEntry stackEntry(std::string name, JSON dictionary, BridgedDataEventTraits traits,
                                           Place place);
/// The type of the data in such entries: pops of it leave typed data alone.
[[nodiscard]] DataType stackEntryType();

/// An entry for a session's stacks: one stack per class of data, as typed session data has. Throws `BridgeError`, and
/// what the conversion throws: nobody else would be told.
[[nodiscard]] AnyDataEventEntry sessionEntry(const BridgedSessionData& data, BridgedDataEventTraits traits);

/// The library's form of a host's completion.
[[nodiscard]] EventSubmitCompletion libraryCompletion(BridgedSubmitCompletion completion);

}  // namespace corvane::bridge
