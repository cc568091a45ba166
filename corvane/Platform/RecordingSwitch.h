#pragma once

#include <atomic>

namespace corvane {

/// Whether events are recorded, as the host's user has said: one answer of the process, for the documents directory as
/// it is set now, kept in a small file there, which every process that shares the directory obeys. It is on until
/// somebody says otherwise; a file that cannot be read, or says neither, means off, since it was somebody's word. Safe
/// from any thread. Internal.
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
    /// The documents directory has been set, and with it another file.
    static void leaveDirectory();

  private:
    enum class Answer : unsigned char { unknown, on, off };
    struct State;

    static State& state();
    static bool find();

    static inline std::atomic<Answer> answer_ = Answer::unknown;
};

}  // namespace corvane
