#pragma once

#include <corvane/Platform/Mutex.h>

#include <atomic>
#include <cstdint>
#include <filesystem>
#include <optional>

namespace corvane {

/// Whether events are recorded, as the host's user has said: one answer for the documents directory as it is set now,
/// kept in a small file there, which every process that shares the directory obeys. It is on until somebody says
/// otherwise; a file that cannot be read, or says neither, means off, since it was somebody's word. Safe from any
/// thread. Internal.
class RecordingSwitch {
  public:
    [[nodiscard]] static RecordingSwitch& shared();

    /// What was said last in this process, or by another one as far as `look` has seen. Two loads; the first time in a
    /// directory the file is read.
    [[nodiscard]] bool isOn();
    /// Says it to this process at once; `save` tells the others, and the next run.
    void set(bool isOn);
    /// Writes what was said last. Throws `SystemError` or `InvalidArgument`; it is then this process's alone, until
    /// `save` succeeds.
    void save();
    /// Hears what another process has said since: looks at the file's name, and reads it when it is another file.
    void look();

  private:
    struct FileStamp {
        std::uint64_t device = 0, node = 0;
        std::int64_t seconds = 0, nanoseconds = 0, size = 0;
        bool operator==(const FileStamp&) const = default;
    };

    RecordingSwitch() = default;

    [[nodiscard]] std::optional<FileStamp> stamp() const CORVANE_REQUIRES(mutex_);
    /// Finds the file of the directory as it is set now, and reads it.
    void turnTo(unsigned directory) CORVANE_REQUIRES(mutex_);
    void read() CORVANE_REQUIRES(mutex_);

    static constexpr unsigned nowhere = 0;
    std::atomic<unsigned> directory_ = nowhere;  // which setting of the directory the answer is of
    std::atomic<bool> isOn_ = true;

    Mutex mutex_;
    std::filesystem::path file_ CORVANE_GUARDED_BY(mutex_);  // empty without a directory
    std::optional<FileStamp> seen_ CORVANE_GUARDED_BY(mutex_);
    bool isUnsaved_ CORVANE_GUARDED_BY(mutex_) = false;
};

}  // namespace corvane
