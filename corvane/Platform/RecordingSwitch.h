#pragma once

#include <atomic>
#include <cstdint>
#include <functional>

namespace corvane {

/// Whether events are recorded, and since when what was recorded is to be forgotten, as the host's user has said: one
/// answer of the process, for the documents directory as it is set now, kept in a small file there, which every process
/// that shares the directory obeys. It is on until somebody says otherwise; a file that cannot be read, or says
/// neither, means off, since it was somebody's word. Safe from any thread; what writes waits for other processes that
/// write, up to five seconds. Internal.
///
/// The epoch is a number that grows with every `forget`. What was recorded in an earlier one is neither stored nor sent
/// by whoever has seen a later one; a database keeps the epoch up to which its rows have been dropped.
class RecordingSwitch {
  public:
    /// What was said last in this process, or by another one as far as `look` has seen. A load; the first time in a
    /// directory its file is read.
    [[nodiscard]] static bool isOn() {
        const Answer answer = answer_.load(std::memory_order_relaxed);
        return answer == Answer::on || (answer == Answer::unknown && find());
    }
    /// Says it to this process at once; `save` tells the others, and the next run.
    static void set(bool isOn);
    /// Writes what was said last. Throws `SystemError` or `InvalidArgument`; it is then this process's alone, until
    /// `save` succeeds.
    static void save();
    /// Hears what another process has said since: looks at the file's name, and reads it when it is another file.
    static void look();

    /// The epoch as of the last look; 0 as long as nothing was ever forgotten.
    [[nodiscard]] static std::int64_t epoch() {
        if (answer_.load(std::memory_order_relaxed) == Answer::unknown) find();
        return epoch_.load(std::memory_order_relaxed);
    }
    /// Begins a new epoch, for every process, and returns it. Throws as `save` does; nothing has changed then.
    static std::int64_t raiseEpoch();
    /// The epoch that has begun, while it is not known that what was recorded before it is dropped everywhere: of this
    /// process's or another one's, which may have been killed. 0 otherwise.
    [[nodiscard]] static std::int64_t unfinishedEpoch();
    /// Notes that what was recorded before an epoch is dropped. Throws as `save` does.
    static void finishEpoch(std::int64_t epoch);
    /// The documents directory has been set, and with it another file.
    static void leaveDirectory();

  private:
    enum class Answer : unsigned char { unknown, on, off };
    struct State;

    struct Word;

    static State& state();
    static bool find();
    /// Writes the file anew as `change` says, with no other process's change in between.
    static void rewrite(const std::function<void(Word&)>& change);

    static inline std::atomic<Answer> answer_ = Answer::unknown;
    static inline std::atomic<std::int64_t> epoch_ = 0;
};

}  // namespace corvane
