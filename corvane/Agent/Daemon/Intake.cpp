#include <corvane/Agent/Daemon/Intake.h>

#include <corvane/Agent/Daemon/WallClock.h>
#include <corvane/Agent/FormatError.h>
#include <corvane/Platform/Descriptor.h>
#include <corvane/Transfer/TransferError.h>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <exception>

namespace corvane::transferd {

void Intake::load() {
    book_.load([this](std::int64_t number, const TransferSubmission& submission) {
        lastEarlier_ = number;  // in the order in which they were accepted
        enqueue(number, submission);
    });
}

void Intake::acceptSpooled() {
    for (const auto& token : directory_.spooled()) {
        try {
            const auto number = accept(token);
            if (isFirstLook_) lastEarlier_ = std::max(lastEarlier_, number);
        } catch (const std::exception&) {
        }
    }
    isFirstLook_ = false;
}

// Removes the submission once the journal has it, or once it is clear that it never will.
std::int64_t Intake::accept(const std::string& token) {
    const auto path = directory_.submissionPath(token);
    if (const auto known = book_.find(token)) {
        unlink(path.c_str());
        return *known;
    }
    TransferSubmission submission;
    try {
        submission = read(token);
    } catch (const FormatError&) {
        unlink(path.c_str());
        throw;
    }
    const auto now = wallClock();
    const auto number = book_.accept(submission, now);
    if (unlink(path.c_str()) != 0) noteChange();  // withdrawn in this moment
    book_.setWakeCommand(*book_.task(number).owner, submission.wakeCommand, now);
    enqueue(number, submission);
    return number;
}

TransferSubmission Intake::read(const std::string& token) const {
    const auto path = directory_.submissionPath(token);
    const Descriptor opened(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
    struct stat status {};
    if (!opened || fstat(opened.get(), &status) != 0) throw SystemError("read " + path.string(), errno);
    if (!S_ISREG(status.st_mode) || status.st_uid != geteuid()) throw FormatError("not a file of this user");
    if (status.st_size > static_cast<off_t>(TransferSubmission::longest)) throw FormatError("too long");
    std::string bytes(static_cast<std::size_t>(status.st_size), '\0');
    const ssize_t count = ::read(opened.get(), bytes.data(), bytes.size());
    if (count != status.st_size) throw FormatError("the submission cannot be read whole");
    auto submission = TransferSubmission::decode(bytes);
    if (submission.token != token) throw FormatError("the submission is another task's");
    TransferSubmission::checkNames(submission.session, submission.owner, submission.wakeCommand);
    return submission;
}

void Intake::enqueue(std::int64_t number, const TransferSubmission& submission) {
    try {
        queue_.add(number, submission);
    } catch (const TransferError&) {
        book_.complete(number, {AnyError::current(), std::nullopt});
    }
}

}  // namespace corvane::transferd
