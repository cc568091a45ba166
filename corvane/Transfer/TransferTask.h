#pragma once

#include <corvane/Export.h>

#include <cstdint>
#include <optional>
#include <string>

namespace corvane {

/// One upload of a transfer session.
///
/// Made by `TransferSession::uploadTask`, suspended; shared between the session, which holds it until its completion
/// callback has returned, and whoever asked for it. Letting go of a task does not stop it, and a task may outlive its
/// session: it then never runs. All operations may be called from any thread.
class CORVANE_EXPORT TransferTask {
  public:
    enum class State {
        running,     ///< resumed, and its completion callback has not returned yet
        suspended,   ///< not resumed yet
        cancelling,  ///< told to stop, not completed yet
        completed,   ///< over, and the delegate has been told
    };

    virtual ~TransferTask() = default;

    /// Unique in its session.
    [[nodiscard]] virtual std::int64_t identifier() const = 0;

    /// Text of the owner's, kept with the task also where tasks outlive the process.
    [[nodiscard]] virtual std::optional<std::string> description() const = 0;
    virtual void setDescription(std::string description) = 0;

    [[nodiscard]] virtual State state() const = 0;

    /// Starts a suspended task; a task in another state stays as it is. Failures of any kind are reported through the
    /// delegate, later.
    virtual void resume() = 0;
};

}  // namespace corvane
