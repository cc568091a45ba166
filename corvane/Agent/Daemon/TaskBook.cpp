#include <corvane/Agent/Daemon/TaskBook.h>

#include <corvane/Agent/Daemon/JournalError.h>
#include <corvane/Agent/FormatError.h>
#include <corvane/Agent/OutcomeCodec.h>

#include <algorithm>

namespace corvane::transferd {

namespace {

// Without symbolic links as far as it exists.
std::filesystem::path resolved(const std::filesystem::path& path) {
    std::error_code failed;
    const auto real = std::filesystem::weakly_canonical(path, failed);
    const auto normal = failed ? path.lexically_normal() : real;
    return normal.has_filename() ? normal : normal.parent_path();  // without a slash at its end
}

bool isThere(const std::filesystem::path& path) {
    std::error_code failed;
    return std::filesystem::exists(path, failed);
}

bool isSameOrBeneath(const std::filesystem::path& path, const std::filesystem::path& directory) {
    return std::mismatch(directory.begin(), directory.end(), path.begin(), path.end()).first == directory.end();
}

}  // namespace

void TaskBook::load(const std::function<void(std::int64_t number, const TransferSubmission&)>& visit) {
    std::vector<std::int64_t> unreadable;
    journal_.forEach([&](const Journal::Task& task) {
        const bool isSomebodys = TransferSubmission::isToken(task.submission.token) && !task.submission.session.empty();
        if (!task.isReadable) unreadable.push_back(task.number);
        if (!task.isReadable && !isSomebodys) return;
        index(task.number, task.accepted, task.submission, task.isOver);
        if (task.isReadable && !task.isOver) visit(task.number, task.submission);
    });
    for (const auto number : unreadable) failUnreadable(number);
    settle();
}

void TaskBook::failUnreadable(std::int64_t number) {
    if (!tasks_.contains(number)) {
        unforgotten_.push_back(number);
    } else if (tasks_.at(number).owner->open.contains(number)) {
        complete(number, unreadableOutcome());
    }
}

TaskBook::Owner& TaskBook::owner(const std::string& session, const std::string& key) {
    const auto [found, isNew] = owners_.try_emplace({session, key});
    if (!isNew) return found->second;
    found->second.session = session;
    found->second.key = key;
    try {
        found->second.wakeCommand = journal_.wake(session, key);
    } catch (const JournalError&) {  // said again with every submission and every connection
    }
    return found->second;
}

void TaskBook::setWakeCommand(Owner& owner, const std::vector<std::string>& command, std::int64_t now) {
    constexpr std::int64_t isRecent = std::int64_t{1000} * 60 * 60 * 24;
    if (command.empty() || (command == owner.wakeCommand && now - owner.lastHeard < isRecent)) return;
    owner.wakeCommand = command;
    try {
        journal_.setWake(owner.session, owner.key, command, now);
        owner.lastHeard = now;
    } catch (const JournalError&) {  // said again with every submission and every connection
    }
}

void TaskBook::dropOwners(const std::function<bool(const Owner&)>& isReferredTo) {
    std::erase_if(owners_, [&](const auto& one) {
        const Owner& owner = one.second;
        return owner.open.empty() && owner.over.empty() && !isReferredTo(owner);
    });
}

std::int64_t TaskBook::accept(const TransferSubmission& submission, std::int64_t now) {
    if (tasks_.size() >= mostTasks) throw JournalError("the agent has too many tasks");
    const auto number = journal_.accept(submission, now);
    index(number, now, submission, false);
    return number;
}

void TaskBook::index(std::int64_t number, std::int64_t accepted, const TransferSubmission& submission, bool isOver) {
    Owner& by = owner(submission.session, submission.owner);
    std::int64_t expires = 0;
    if (__builtin_add_overflow(accepted, submission.patience.count(), &expires)) expires = accepted;  // a damaged row's
    tasks_.emplace(number, Task{submission.token, &by, expires, submission.wantsProgress()});
    numbers_.emplace(submission.token, number);
    if (isOver) {
        by.over.emplace(number, 0);
    } else {
        by.open.insert(number);
    }
}

void TaskBook::complete(std::int64_t number, const TransferOutcome& outcome) {
    unwritten_[number] = encodeOutcome(outcome);
    Owner& by = *tasks_.at(number).owner;
    by.open.erase(number);
    by.over.emplace(number, 0);
}

void TaskBook::forget(std::int64_t number) {
    unforgotten_.push_back(number);
    unwritten_.erase(number);
    const auto found = tasks_.find(number);
    found->second.owner->open.erase(number);
    found->second.owner->over.erase(number);
    numbers_.erase(found->second.token);
    tasks_.erase(found);
}

// What was reported goes first, and by itself where there is no room for all: its room is what the rest may need.
bool TaskBook::settle() {
    return settleTogether() || settleOneByOne();
}

bool TaskBook::settleTogether() {
    if (isSettled()) return true;
    try {
        journal_.together([this] {
            for (const auto number : unforgotten_) journal_.forget(number);
            for (const auto& [number, outcome] : unwritten_) journal_.complete(number, outcome);
        });
    } catch (const JournalError&) {
        return false;
    }
    unforgotten_.clear();
    unwritten_.clear();
    return true;
}

bool TaskBook::settleOneByOne() {
    try {
        for (; !unforgotten_.empty(); unforgotten_.pop_back()) journal_.forget(unforgotten_.back());
        for (; !unwritten_.empty(); unwritten_.erase(unwritten_.begin())) {
            journal_.complete(unwritten_.begin()->first, unwritten_.begin()->second);
        }
        return true;
    } catch (const JournalError&) {  // tried again later
        return false;
    }
}

std::vector<std::int64_t> TaskBook::withBodiesGoneBeneath(const std::filesystem::path& directory) {
    std::vector<std::int64_t> numbers;
    const auto top = resolved(directory);
    std::map<std::filesystem::path, bool> folders;  // most bodies are in few of them
    journal_.forEach([&](const Journal::Task& task) {
        if (!task.isReadable || !contains(task.number)) return;
        const auto folder = std::filesystem::path(task.submission.bodyPath).parent_path();
        auto [found, isNew] = folders.try_emplace(folder);
        if (isNew) found->second = isSameOrBeneath(resolved(folder), top);
        if (found->second && !isThere(task.submission.bodyPath)) numbers.push_back(task.number);
    });
    return numbers;
}

std::optional<std::int64_t> TaskBook::find(std::string_view token) const {
    const auto found = numbers_.find(std::string(token));
    if (found == numbers_.end()) return std::nullopt;
    return found->second;
}

std::string TaskBook::outcome(std::int64_t number) {
    if (const auto found = unwritten_.find(number); found != unwritten_.end()) return found->second;
    std::string bytes = journal_.outcome(number);
    try {
        static_cast<void>(decodeOutcome(bytes));
    } catch (const FormatError&) {
        bytes = encodeOutcome(unreadableOutcome());
    }
    return bytes;
}

}  // namespace corvane::transferd
