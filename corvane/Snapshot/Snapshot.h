#pragma once

#include <corvane/Models/TrackerTimer.h>
#include <corvane/Snapshot/SnapshotType.h>

#include <functional>
#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace corvane {

/// What one tracker of the chain held.
struct SnapshotLevel {
    std::string name;  ///< the tracker's
    /// By key, oldest first. Under `now` one entry per key, and only of keys that no nearer level has.
    std::map<std::string, std::vector<AnyDataEventEntry>, std::less<>> entries;
    TrackerTimers timers;
};

/// See SnapshotType. Internal.
class Snapshot final : public SnapshotType {
  public:
    using SnapshotType::evaluate;

    /// @param levels the nearest tracker first
    Snapshot(SnapshotPolicy policy, std::vector<SnapshotLevel> levels, std::shared_ptr<EventMirrorStore> mirrorStore);
    Snapshot(const Snapshot&) = default;
    ~Snapshot() override;

    [[nodiscard]] SnapshotPolicy policy() const { return policy_; }
    [[nodiscard]] const std::vector<SnapshotLevel>& levels() const { return levels_; }
    [[nodiscard]] SnapshotEvent evaluate(const EventSubmit& event) const override;

  private:
    [[nodiscard]] const AnyDataEventEntry* lookup(std::string_view key) const;

    const SnapshotPolicy policy_;
    const std::vector<SnapshotLevel> levels_;
    const std::shared_ptr<EventMirrorStore> eventMirrorStore_;
};

}  // namespace corvane
