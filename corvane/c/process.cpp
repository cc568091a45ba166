// What the whole process has one of: the log, the documents directory, the main queue, the kind of transfers.

#include <corvane/Agent/Host/BackgroundTransferSession.h>
#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/MainQueue.h>
#include <corvane/Transfer/InProcessTransferSession.h>
#include <corvane/c/Call.h>
#include <corvane/c/Processor.h>
#include <corvane/c/corvane.h>

#include <utility>

using namespace corvane;
using namespace corvane::c;

namespace {

LogLevel levelOf(std::int32_t level) {
    if (level < CORVANE_LEVEL_DEBUG || level > CORVANE_LEVEL_ERROR) {
        refuse(CORVANE_INVALID_ARGUMENT, "a level of the log is unknown");
    }
    return static_cast<LogLevel>(level);
}

void set(std::chrono::milliseconds& time, std::int64_t given, const char* what) {
    if (const auto other = duration(given, what)) time = *other;
}

TransferAgentOptions agentOptions(const corvane_agent_options* given) {
    const auto options = read(given, "the options");
    TransferAgentOptions agent;
    agent.program = optionalText(options.program, "the agent's program");
    agent.directory = optionalText(options.directory, "the agent's directory");
    for (const char* const* part = options.wake_command; part && *part; ++part) {
        agent.wakeCommand.push_back(text(*part, "the wake command"));
    }
    set(agent.deadline, options.deadline, "the deadline");
    set(agent.holdOff, options.hold_off, "the time to hold off");
    set(agent.idleTime, options.idle_time, "the idle time");
    set(agent.retryDelay, options.retry_delay, "the retry delay");
    set(agent.patience, options.patience, "the patience");
    set(agent.patienceWithoutHost, options.patience_without_host, "the patience without a host");
    return agent;
}

}  // namespace

bool corvane_log_set_level(int32_t level, corvane_error* error) {
    return call(error, [&] { Log::shared().setLevel(levelOf(level)); });
}

bool corvane_log_set_hides_private(bool hides, corvane_error* error) {
    return call(error, [&] { Log::shared().setHidesPrivateArguments(hides); });
}

bool corvane_log_set_sink(corvane_log_sink sink, void* context, corvane_destroy destroy, corvane_error* error) {
    return call(error, context, destroy, [&](Context owned) {
        if (!sink) return Log::shared().setSink({});
        const Callback<void(void*, std::int32_t, const char*)> callback(sink, std::move(owned));
        Log::shared().setSink([callback](LogLevel level, std::string_view message) {
            callback(static_cast<std::int32_t>(level), std::string(message).c_str());
        });
    });
}

bool corvane_documents_directory_set(const char* path, corvane_error* error) {
    return call(error, [&] {
        std::string directory = text(path, "the path");
        if (directory.empty()) refuse(CORVANE_INVALID_ARGUMENT, "the path of the documents directory is empty");
        DocumentsDirectory::set(std::move(directory));
    });
}

size_t corvane_documents_directory_get(char* buffer, size_t capacity, corvane_error* error) {
    return call(error, [&] {
        if (!buffer && capacity > 0) refuse(CORVANE_NO_OBJECT, "a null pointer stands where there must be a buffer");
        const std::string path = DocumentsDirectory::path().string();
        if (capacity > path.size()) std::memcpy(buffer, path.c_str(), path.size() + 1);
        return path.size();
    });
}

bool corvane_main_queue_set_executor(corvane_executor executor, void* context, corvane_destroy destroy,
                                     corvane_error* error) {
    return call(error, context, destroy, [&](Context owned) {
        if (!executor) return MainQueue::setExecutor({});
        const Callback<void(void*, corvane_task*)> callback(executor, std::move(owned));
        MainQueue::setExecutor([callback](std::function<void()> task) {
            const Lent<TaskObject> lent(std::move(task));
            callback(static_cast<corvane_task*>(lent.pointer()));
        });
    });
}

bool corvane_transfers_agent_is_available(corvane_error* error) {
    return call(error, [] { return BackgroundTransferSession::isAvailable(); });
}

bool corvane_transfers_use_agent(const corvane_agent_options* options, corvane_error* error) {
    return call(error, [&] { TransferSession::setFactory(BackgroundTransferSession::factory(agentOptions(options))); });
}

bool corvane_transfers_use_in_process(corvane_error* error) {
    return call(error, [] { TransferSession::setFactory(InProcessTransferSession::factory()); });
}

bool corvane_transfers_use_default(corvane_error* error) {
    return call(error, [] { TransferSession::setFactory({}); });
}
