// Replays a web server's access log: every request becomes an event at its own time.

#include "../support/CommandLine.h"
#include "LineReader.h"
#include "Progress.h"
#include "Recorder.h"

#include <corvane/corvane.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <memory>

namespace replay {
namespace {

using namespace corvane;
using Clock = std::chrono::steady_clock;

constexpr auto usage =
    "usage: replay --endpoint URL [option ...] FILE\n"
    "\n"
    "Reads a web server's access log in combined log format, line by line, records each request as an event at its "
    "own\n"
    "time and uploads the events to URL. FILE \"-\" is standard input.\n"
    "\n"
    "  --endpoint URL     where to upload to, such as http://127.0.0.1:8080/events\n"
    "  --batch-size N     events in a document (50)\n"
    "  --documents DIR    where the database, the payload files and the key are kept (corvane-replay)\n"
    "  --timeout SECONDS  how long to wait for delivery after the last line (60)\n"
    "  --rate N           record N events a second as they happen now, from the beginning again at the end of FILE, "
    "until\n"
    "                     SIGINT or SIGTERM; a session ends every two seconds\n"
    "\n"
    "A line that is not in the format is counted and skipped. Text that is not UTF-8 is recorded with U+FFFD in the\n"
    "place of each bad byte sequence. What is not delivered in time stays in DIR and goes out with the next run.\n"
    "Exits with 0 when every event was delivered, with 1 when not, and with 2 when it was called wrongly.\n";

struct Options {
    std::string endpoint;
    int batchSize;
    std::filesystem::path documents;
    std::chrono::seconds timeout;
    std::int64_t rate;  // 0: the file once, as fast as it goes
    std::string file;
};

Options optionsFrom(const examples::CommandLine& line) {
    if (line.operands().size() != 1) throw examples::UsageError("exactly one log file is needed");
    if (!line.value("--endpoint")) throw examples::UsageError("--endpoint is needed");
    return {.endpoint = *line.value("--endpoint"),
            .batchSize = static_cast<int>(line.number("--batch-size", 50, 1, 1'000'000)),
            .documents = line.value("--documents").value_or("corvane-replay"),
            .timeout = std::chrono::seconds(line.number("--timeout", 60, 0, 1'000'000)),
            .rate = line.number("--rate", 0, 1, 10'000),
            .file = line.operands().front()};
}

/// The log to read: a file, or standard input.
class Input {
  public:
    explicit Input(const std::string& name) {
        if (name == "-") {
            std::ios::sync_with_stdio(false);  // many times faster
            return;
        }
        if (std::filesystem::is_directory(name)) throw std::runtime_error(name + " is a directory");
        file_.open(name, std::ios::binary);
        if (!file_) throw std::system_error(errno, std::generic_category(), name);
        std::error_code unknown;
        const auto size = std::filesystem::is_regular_file(name) ? std::filesystem::file_size(name, unknown) : 0;
        size_ = unknown ? 0 : static_cast<std::int64_t>(size);
    }

    [[nodiscard]] std::istream& stream() { return file_.is_open() ? static_cast<std::istream&>(file_) : std::cin; }
    /// In bytes; 0 when it is not known.
    [[nodiscard]] std::int64_t size() const { return size_; }

  private:
    std::ifstream file_;
    std::int64_t size_ = 0;
};

struct LineCounts {
    std::int64_t read = 0;
    std::int64_t skipped = 0;
};

LineCounts recordLines(Input& input, Recorder& recorder, Progress& progress) {
    LineReader reader(input.stream());
    LineCounts lines;
    while (reader.next()) {
        ++lines.read;
        auto entry = reader.isTooLong() ? std::nullopt : parseAccessLogLine(reader.line());
        if (entry) {
            recorder.record(std::move(*entry));
        } else {
            ++lines.skipped;
        }
        progress.reading(lines.read, reader.bytesRead());
    }
    return lines;
}

sigset_t stopSignals() {
    sigset_t signals;
    sigemptyset(&signals);
    sigaddset(&signals, SIGINT);
    sigaddset(&signals, SIGTERM);
    return signals;
}

// Whether the program was told to stop before `time`.
bool stopsBefore(Clock::time_point time) {
    const sigset_t signals = stopSignals();
    const auto left = std::max(Clock::duration::zero(), time - Clock::now());
    const auto seconds = std::chrono::floor<std::chrono::seconds>(left);
    const timespec timeout{.tv_sec = static_cast<time_t>(seconds.count()),
                           .tv_nsec = static_cast<long>(std::chrono::nanoseconds(left - seconds).count())};
    return sigtimedwait(&signals, nullptr, &timeout) > 0;
}

// Sessions end often, so that whoever watches sees what was recorded a moment ago.
LineCounts recordSteadily(const Options& options, Recorder& recorder) {
    LineCounts lines;
    const auto step = std::chrono::duration_cast<Clock::duration>(std::chrono::seconds(1)) / options.rate;
    auto due = Clock::now();
    auto sessionEnd = due + std::chrono::seconds(2);
    while (true) {
        Input input(options.file);
        LineReader reader(input.stream());
        const auto readBefore = lines.read - lines.skipped;
        while (reader.next()) {
            ++lines.read;
            auto entry = reader.isTooLong() ? std::nullopt : parseAccessLogLine(reader.line());
            if (!entry) {
                ++lines.skipped;
                continue;
            }
            if (stopsBefore(due)) return lines;
            due += step;
            entry->time = std::chrono::time_point_cast<Date::duration>(std::chrono::system_clock::now());
            recorder.record(std::move(*entry));
            if (Clock::now() < sessionEnd) continue;
            recorder.startNextSession();
            sessionEnd = Clock::now() + std::chrono::seconds(2);
        }
        if (lines.read - lines.skipped == readBefore) throw std::runtime_error(options.file + " has no line to record");
    }
}

DeliveryReport waitForDelivery(const UploadBatchEventProcessor& uploads, std::chrono::seconds timeout,
                               Progress& progress) {
    const auto deadline = Clock::now() + timeout;
    while (true) {
        const auto next = std::min(deadline, Clock::now() + std::chrono::milliseconds(250));
        const DeliveryReport report = uploads.waitForDelivery(next);
        if (Clock::now() < next || next == deadline) return report;
        progress.waiting(report.delivered.documents, report.pending.documents);
    }
}

void print(const char* what, std::int64_t count) {
    std::printf("%s: %lld\n", what, static_cast<long long>(count));
}

void print(const char* what, const DeliveryReport::Count& count) {
    std::printf("%s: %lld in %lld documents\n", what, static_cast<long long>(count.events),
                static_cast<long long>(count.documents));
}

bool replayLog(const Options& options) {
    if (options.rate > 0) {
        if (options.file == "-") throw std::runtime_error("standard input cannot be read again");
        const sigset_t signals = stopSignals();  // before there are threads that could take them
        pthread_sigmask(SIG_BLOCK, &signals, nullptr);
    }
    Input input(options.file);  // first: a wrong name leaves nothing behind
    DocumentsDirectory::set(options.documents);
    TransferSession::setFactory(InProcessTransferSession::factory());  // it waits for its delivery
    Log::shared().setLevel(LogLevel::error);
    const Client client{"com.example.replay", "Replay", "1.0", 1};
    const Endpoint endpoint{options.endpoint, "replay"};
    const auto uploads =
        std::make_shared<UploadBatchEventProcessor>(client, endpoint, UploadBatchEventConfig(options.batchSize, false));
    Recorder recorder(uploads);
    LineCounts lines;
    DeliveryReport report;
    {
        Progress progress(input.size());
        lines = options.rate > 0 ? recordSteadily(options, recorder) : recordLines(input, recorder, progress);
        recorder.finish();
        report = waitForDelivery(*uploads, options.timeout, progress);
    }
    print("lines read", lines.read);
    print("lines skipped", lines.skipped);
    print("events submitted", recorder.submitted());
    print("events failed", recorder.failed());
    print("events delivered", report.delivered);
    if (report.pending.documents > 0) print("events pending", report.pending);
    if (report.givenUp.documents > 0) print("events given up", report.givenUp);
    return recorder.failed() == 0 && report.delivered.events == recorder.submitted() && report.pending.documents == 0 &&
           report.givenUp.documents == 0;
}

int run(int argc, char** argv) {
    try {
        const examples::CommandLine line(argc, argv,
                                         {"--endpoint", "--batch-size", "--documents", "--timeout", "--rate"});
        if (line.wantsHelp()) {
            std::fputs(usage, stdout);
            return EXIT_SUCCESS;
        }
        return replayLog(optionsFrom(line)) ? EXIT_SUCCESS : EXIT_FAILURE;
    } catch (const examples::UsageError& error) {
        std::fprintf(stderr, "replay: %s\n\n%s", error.what(), usage);
        return 2;
    } catch (const std::exception& error) {
        std::fprintf(stderr, "replay: %s\n", error.what());
        return EXIT_FAILURE;
    }
}

}  // namespace
}  // namespace replay

int main(int argc, char** argv) {
    return replay::run(argc, argv);
}
