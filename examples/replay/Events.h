#pragma once

#include <corvane/corvane.h>

#include <cstdint>
#include <optional>
#include <string>

namespace replay {

/// Who asked.
struct Visitor {
    std::string address;
    std::optional<std::string> user;
    std::optional<std::string> agent;
    std::optional<std::string> referrer;
};

/// For what.
struct Page {
    std::optional<std::string> method;
    std::optional<std::string> path;
    std::optional<std::string> query;
    std::optional<std::string> protocol;
};

/// What the server answered.
struct Response {
    std::optional<int> status;
    std::optional<std::int64_t> bytes;
};

/// One request of the log.
struct PageRequest {
    corvane::EventProperty<corvane::EventData> event = corvane::required;
    corvane::EventProperty<Visitor> visitor = corvane::required;
    corvane::EventProperty<Page> page = corvane::required;
    corvane::EventProperty<Response> response = corvane::required;
};

}  // namespace replay
