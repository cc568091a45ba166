#include <corvane/Transferd/TaskBook.h>

#include <corvane/Platform/Error.h>

namespace corvane::transferd {

void TaskBook::load(const std::function<void(std::int64_t number, const TransferSubmission&)>& visit) {
    for (const auto& wake : journal_.wakes()) owner(wake.session, wake.owner).wakeCommand = wake.command;
    journal_.forEach([&](const Journal::Task& task) {
        index(task.number, task.accepted, task.submission, task.isOver);
        if (!task.isOver) visit(task.number, task.submission);
    });
}

TaskBook::Owner& TaskBook::owner(const std::string& session, const std::string& key) {
    const auto [found, isNew] = owners_.try_emplace({session, key});
    if (isNew) {
        found->second.session = session;
        found->second.key = key;
    }
    return found->second;
}

void TaskBook::setWakeCommand(Owner& owner, const std::vector<std::string>& command) {
    if (command.empty() || command == owner.wakeCommand) return;
    owner.wakeCommand = command;
    try {
        journal_.setWake({owner.session, owner.key, command});
    } catch (const InvalidArgument&) {  // said again with every submission and every connection
    }
}

std::int64_t TaskBook::add(const TransferSubmission& submission, std::int64_t now) {
    if (tasks_.size() >= mostTasks) throw InvalidArgument("the agent has too many tasks");
    const auto number = journal_.add(submission, now);
    index(number, now, submission, false);
    return number;
}

void TaskBook::index(std::int64_t number, std::int64_t accepted, const TransferSubmission& submission, bool isOver) {
    Owner& by = owner(submission.session, submission.owner);
    tasks_.emplace(number, Task{submission.token, &by, accepted + submission.patience.count()});
    numbers_.emplace(submission.token, number);
    if (isOver) {
        by.over.emplace(number, 0);
    } else {
        by.open.insert(number);
    }
}

void TaskBook::finish(std::int64_t number, const TransferOutcome& outcome) {
    try {
        journal_.finish(number, outcome.encoded());
    } catch (const InvalidArgument&) {
        unwritten_[number] = outcome.encoded();
    }
    Owner& by = *tasks_.at(number).owner;
    by.open.erase(number);
    by.over.emplace(number, 0);
}

void TaskBook::forget(std::int64_t number) {
    unforgotten_.push_back(number);
    try {
        while (!unforgotten_.empty()) {
            journal_.forget(unforgotten_.back());
            unforgotten_.pop_back();
        }
    } catch (const InvalidArgument&) {  // tried again with the next one
    }
    const auto found = tasks_.find(number);
    found->second.owner->open.erase(number);
    found->second.owner->over.erase(number);
    numbers_.erase(found->second.token);
    tasks_.erase(found);
    unwritten_.erase(number);
}

std::optional<std::int64_t> TaskBook::find(std::string_view token) const {
    const auto found = numbers_.find(std::string(token));
    if (found == numbers_.end()) return std::nullopt;
    return found->second;
}

std::string TaskBook::outcome(std::int64_t number) {
    const auto found = unwritten_.find(number);
    return found == unwritten_.end() ? journal_.outcome(number) : found->second;
}

}  // namespace corvane::transferd
