#pragma once

#include <corvane/corvane.h>

#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <iomanip>
#include <iostream>
#include <map>
#include <mutex>
#include <sstream>
#include <string>
#include <utility>

namespace consent {

using namespace corvane;

/// Shows what becomes of what is recorded: on standard error, in a line that is written over on a terminal, and as a
/// new line once a second elsewhere. Any thread.
class Display {
  public:
    void observe(const DeliveryUpdate& update) {
        const std::lock_guard lock(mutex_);
        if (update.step == DeliveryUpdate::Step::underWay) {
            underWay_.emplace(update.document, 0);
        } else if (update.step == DeliveryUpdate::Step::progress) {
            bytesSent_ += update.bytesSent - std::exchange(underWay_[update.document], update.bytesSent);
        } else {
            underWay_.erase(update.document);  // delivered, deferred or given up
        }
    }

    void show(const Ledger& ledger, bool isRecording) {
        const std::lock_guard lock(mutex_);
        std::ostringstream line;
        line << (isRecording ? "on" : "off") << " | events: " << ledger.open.events << " open, "
             << ledger.waiting.events << " waiting, " << ledger.delivered.events << " delivered, "
             << ledger.givenUp.total().events + ledger.refused.total().events << " given up | " << underWay_.size()
             << " under way, " << bytesSent_ << " bytes sent";
        const auto time = std::chrono::steady_clock::now();
        if (shown_ == line.str() || (!isTerminal_ && time < next_)) return;
        shown_ = line.str();
        next_ = time + std::chrono::seconds(1);
        // Cut off at the edge: what goes on in the next line could not be written over.
        std::fprintf(stderr, isTerminal_ ? "\r\x1b[K\x1b[?7l%s\x1b[?7h" : "%s\n", shown_.c_str());
    }

    /// Says something beside the line.
    void say(const std::string& text) {
        const std::lock_guard lock(mutex_);
        std::fprintf(stderr, isTerminal_ ? "\r\x1b[K%s\n" : "%s\n", text.c_str());
        shown_.clear();
    }

  private:
    const bool isTerminal_ = isatty(STDERR_FILENO) == 1;
    std::mutex mutex_;
    std::map<std::string, std::int64_t> underWay_;  // the bytes of each document that have gone out
    std::int64_t bytesSent_ = 0;
    std::string shown_;
    std::chrono::steady_clock::time_point next_;  // when the next line is due, without a terminal
};

/// The ledger as a table, on standard output.
inline void print(const Ledger& ledger) {
    const auto& [noSession, missingData, encoding, notRecording, other] = ledger.notAccepted;
    const std::pair<const char*, Ledger::Count> rows[] = {
        {"in open batches", ledger.open},
        {"waiting", ledger.waiting},
        {"delivered", ledger.delivered},
        {"refused", ledger.refused.total()},
        {"forgotten", ledger.givenUp.forgotten},
        {"given up, all reasons", ledger.givenUp.total()},
        {"unknown", ledger.unknown},
        {"accepted, in all runs", ledger.accepted()},
        {"accepted, in this run", {ledger.acceptedInRun, 0}},
        {"unaccounted, in this run", {ledger.unaccounted, 0}},
        {"sent again", ledger.sentAgain},
        {"not accepted: not recording", {notRecording, 0}},
        {"not accepted: otherwise", {noSession + missingData + encoding + other, 0}},
    };
    std::cout << '\n' << std::setw(47) << "events  documents" << '\n';
    for (const auto& [name, count] : rows) {
        std::cout << std::left << std::setw(28) << name << std::right << std::setw(8) << count.events << std::setw(11)
                  << count.documents << '\n';
    }
}

}  // namespace consent
