#pragma once

#include <corvane/Agent/AgentDirectory.h>
#include <corvane/Platform/Descriptor.h>

namespace corvane::transferd {

/// Tells when something arrives in the spool or a task is taken back, also from a host that has no connection. Where
/// the system gives no watch, there is none: submissions are then found when a client says so or leaves.
class DirectoryWatch {
  public:
    explicit DirectoryWatch(const AgentDirectory& directory);

    /// Readable when there is news; -1 without a watch.
    [[nodiscard]] int descriptor() const { return watch_.get(); }
    /// Takes the news. False when the directory has been removed.
    [[nodiscard]] bool take();

  private:
    Descriptor watch_;
};

}  // namespace corvane::transferd
