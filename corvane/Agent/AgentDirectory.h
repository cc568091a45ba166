#pragma once

#include <corvane/Platform/Descriptor.h>

#include <filesystem>
#include <string>
#include <string_view>
#include <vector>

namespace corvane {

/// The directory that a transfer agent and the processes that use it share: its socket, its lock, its journal, the
/// spool of submissions that it has not seen yet, and the marks of tasks that were taken back from it.
///
/// Mode 0700, and used only when it belongs to the user. A value; safe from any thread and with several processes.
/// docs/formats/transfer-journal.md says what is in it. Internal.
class AgentDirectory {
  public:
    /// Its name in a documents directory, unless the host says otherwise.
    static constexpr const char* usualName = "com.veskar.corvane.transfer-agent";

    /// Creates what is missing. Throws `SystemError`, and `InvalidArgument` when the directory is another user's.
    explicit AgentDirectory(const std::filesystem::path& directory);

    [[nodiscard]] const std::filesystem::path& path() const { return path_; }
    [[nodiscard]] std::filesystem::path journalPath() const { return path_ / "journal.db"; }
    [[nodiscard]] std::filesystem::path lockPath() const { return path_ / "agent.lock"; }
    [[nodiscard]] std::filesystem::path spoolPath() const { return path_ / "spool"; }
    [[nodiscard]] std::filesystem::path withdrawnPath() const { return path_ / "withdrawn"; }
    [[nodiscard]] std::filesystem::path submissionPath(std::string_view token) const { return spoolPath() / token; }

    /// A connected, non-blocking socket; none, and `errno`, when nobody answers there. However long the path is.
    [[nodiscard]] Descriptor connect() const;
    /// A listening, non-blocking socket in the place of one that a killed agent has left. Throws `SystemError`.
    /// Requires: the caller holds the lock.
    [[nodiscard]] Descriptor listen() const;
    void removeSocket() const;

    /// Takes a task back from the agent: it does not start it any more, whether it has seen it or not. True when the
    /// agent had not seen it.
    bool withdraw(std::string_view token) const;
    [[nodiscard]] bool isWithdrawn(std::string_view token) const;
    /// The marks of tasks that were taken back.
    [[nodiscard]] std::vector<std::string> withdrawn() const;
    void removeMark(std::string_view token) const;

    /// The tokens in the spool, in the order in which they were made.
    [[nodiscard]] std::vector<std::string> spooled() const;

  private:
    std::filesystem::path path_;
};

}  // namespace corvane
