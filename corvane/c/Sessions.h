#pragma once

// Internal: what hosts have of the library's objects.

#include <corvane/Bridge/Session/BridgedSessionManager.h>
#include <corvane/c/Objects.h>

#include <atomic>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace corvane::c {

class Sessions final : public Object {
  public:
    static constexpr Kind kind = Kind::sessions;

    BridgedSessionManager manager;
    std::atomic<int> suspensions = 0;  // by the host, which may resume as often
};

class SessionAccess final : public Object {
  public:
    static constexpr Kind kind = Kind::sessionAccess;

    explicit SessionAccess(std::shared_ptr<BridgedAccessSessionManager> given) : access(std::move(given)) {}

    const std::shared_ptr<BridgedAccessSessionManager> access;
};

class TrackerObject final : public Object {
  public:
    static constexpr Kind kind = Kind::tracker;

    explicit TrackerObject(std::shared_ptr<BridgedTracker> given) : tracker(std::move(given)), path(tracker->path()) {}

    const std::shared_ptr<BridgedTracker> tracker;
    const std::vector<std::string> path;
};

class Access final : public Object {
  public:
    static constexpr Kind kind = Kind::access;

    explicit Access(std::shared_ptr<BridgedAccessTracker> given) : access(std::move(given)) {}

    const std::shared_ptr<BridgedAccessTracker> access;
};

}  // namespace corvane::c
