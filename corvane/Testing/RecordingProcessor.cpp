#include <corvane/Testing/RecordingProcessor.h>

#include <algorithm>
#include <future>
#include <stdexcept>
#include <utility>

namespace corvane::test {

namespace {

std::string listing(const std::vector<RecordedEvent>& events) {
    if (events.empty()) return "; nothing was recorded";
    std::string text = "; recorded:";
    for (const auto& event : events) text += "\n  " + event.description();
    return text;
}

}  // namespace

std::vector<std::shared_ptr<SerialQueue>> RecordingProcessor::queues() const {
    std::lock_guard lock(mutex_);
    return queues_;
}

void RecordingProcessor::settle() const {
    for (const auto& queue : queues()) {
        if (!queue->isCurrent()) queue->sync([] {});
    }
}

void RecordingProcessor::settleByWorker() const {
    for (const auto& queue : queues()) {
        std::promise<void> reached;
        queue->async([&] { reached.set_value(); });
        reached.get_future().wait();
    }
}

bool RecordingProcessor::isOnQueue() const {
    const auto all = queues();
    return std::any_of(all.begin(), all.end(), [](const auto& queue) { return queue->isCurrent(); });
}

std::vector<RecordedEvent> RecordingProcessor::events() const {
    settle();
    std::lock_guard lock(mutex_);
    return record_.events;
}

std::vector<RecordedEvent> RecordingProcessor::events(std::string_view name) const {
    auto found = events();
    std::erase_if(found, [&](const auto& event) { return event.name() != name; });
    return found;
}

RecordedEvent RecordingProcessor::only(std::string_view name) const {
    if (const auto problem = checkOnly(name); !problem.empty()) throw std::runtime_error(problem);
    return events(name).front();
}

std::string RecordingProcessor::checkOnly(std::string_view name, const std::vector<ExpectedField>& fields) const {
    return checkCount(1, name, fields);
}

std::string RecordingProcessor::checkCount(std::size_t count, std::string_view name,
                                           const std::vector<ExpectedField>& fields) const {
    const auto all = events();
    const auto found = static_cast<std::size_t>(std::count_if(
        all.begin(), all.end(), [&](const auto& event) { return event.name() == name && event.has(fields); }));
    if (found == count) return {};
    std::string message = "expected " + std::to_string(count) + " of " + std::string(name);
    for (const auto& [path, value] : fields) message += ", " + path + " = " + value.text();
    return message + ", and there are " + std::to_string(found) + listing(all);
}

std::string RecordingProcessor::checkNames(const std::vector<std::string>& names) const {
    const auto all = events();
    if (std::equal(all.begin(), all.end(), names.begin(), names.end(),
                   [](const auto& event, const auto& name) { return event.name() == name; })) {
        return {};
    }
    std::string message = "expected";
    for (const auto& name : names) message += " " + name;
    return message + (names.empty() ? " no events" : "") + listing(all);
}

std::vector<std::string> RecordingProcessor::history() const {
    settle();
    std::lock_guard lock(mutex_);
    return record_.history;
}

std::vector<Session> RecordingProcessor::sessions() const {
    settle();
    std::lock_guard lock(mutex_);
    return record_.sessions;
}

std::vector<Date> RecordingProcessor::endDates() const {
    settle();
    std::lock_guard lock(mutex_);
    return record_.endDates;
}

std::vector<Group> RecordingProcessor::groups() const {
    settle();
    std::lock_guard lock(mutex_);
    return record_.groups;
}

void RecordingProcessor::clear() {
    settle();
    std::lock_guard lock(mutex_);
    record_ = {};
}

void RecordingProcessor::registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) {
    std::lock_guard lock(mutex_);
    if (std::find(queues_.begin(), queues_.end(), accessQueue) == queues_.end()) {
        queues_.push_back(std::move(accessQueue));
    }
}

void RecordingProcessor::process(const ProcessEvent& event) {
    std::lock_guard lock(mutex_);
    record_.events.emplace_back(event);
    record_.history.push_back("process " + event.name());
}

void RecordingProcessor::didEnterGroup(const Group& group) {
    std::lock_guard lock(mutex_);
    record_.groups.push_back(group);
    record_.history.push_back("enter " + group.name);
}

void RecordingProcessor::didLeaveGroup(const Group& group) {
    std::lock_guard lock(mutex_);
    record_.history.push_back("leave " + group.name);
}

void RecordingProcessor::didStartSession(const Session& session) {
    note("start", session);
}

void RecordingProcessor::didUpdateSession(const Session& session, bool submitQueues) {
    note(submitQueues ? "update+submit" : "update", session);
}

void RecordingProcessor::didEndSession(const Session& session, Date endDate) {
    note("end", session);
    std::lock_guard lock(mutex_);
    record_.endDates.push_back(endDate);
}

void RecordingProcessor::note(const char* what, const Session& session) {
    std::lock_guard lock(mutex_);
    record_.history.emplace_back(what);
    record_.sessions.push_back(session);
}

}  // namespace corvane::test
