#pragma once

#include <corvane/Models/JSON.h>
#include <corvane/Processing/EncodedEvents.h>

#include <chrono>
#include <cstddef>
#include <memory>
#include <string>
#include <vector>

namespace corvane {

/// An open batch: the events that become one document, in the parts that are its rows. A row takes so many events that
/// rewriting it costs about the same for each of them, however large the batch grows; a further part is a row of its
/// own, and a valid batch by itself. Not thread-safe. Internal.
class UploadBatch {
  public:
    static constexpr std::size_t eventsOfPart = 50;
    static constexpr std::size_t bytesOfPart = std::size_t{64} * 1024;

    using Clock = std::chrono::steady_clock;

    struct Part {
        std::string identifier;  // the row's
        JSON session;            // the session's JSON form as of the last event
        std::shared_ptr<EncodedEvents> events;
        bool isDue = true;        // to be written at the end of the run
        bool isBackedUp = false;  // the row holds all events
        bool hasRow = false;      // there may be a row
        std::size_t saved = 0;    // how many events the row holds
    };

    /// Adds an event to the last part, or to a new one when that is full.
    void append(const JSON& payload, const JSON& session);
    /// Puts a batch in front of this one whose events came before; in one part, if they fit and this one has no row
    /// yet.
    void prepend(UploadBatch earlier);

    [[nodiscard]] std::size_t count() const { return count_; }
    /// Of the events' text.
    [[nodiscard]] std::size_t bytes() const { return bytes_; }
    [[nodiscard]] bool isEmpty() const { return parts_.empty(); }
    /// When the first event was added.
    [[nodiscard]] Clock::time_point begin() const { return begin_; }
    [[nodiscard]] bool isBackedUp() const;
    /// Never empty, once an event was added.
    [[nodiscard]] std::vector<Part>& parts() { return parts_; }
    [[nodiscard]] const std::vector<Part>& parts() const { return parts_; }
    /// The part of that identifier, or nullptr.
    [[nodiscard]] Part* find(const std::string& identifier);
    /// Takes the part of that identifier out, if it is there.
    [[nodiscard]] UploadBatch take(const std::string& identifier);

  private:
    std::vector<Part> parts_;
    std::size_t count_ = 0, bytes_ = 0;
    Clock::time_point begin_ = {};
};

}  // namespace corvane
