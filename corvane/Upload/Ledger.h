#pragma once

#include <corvane/Upload/DeliveryReport.h>

#include <cstdint>

namespace corvane {

/// What became of everything that was recorded for one endpoint, in all runs and processes that use its database. A
/// value.
///
/// Every event that was accepted is in exactly one of `open`, `waiting`, `delivered`, `refused`, `givenUp` and
/// `unknown`, and so is every document that was handed over. What changes one of these changes it in the transaction
/// that writes or deletes the row, so that a kill, a second process and an outcome that is reported twice count once.
/// What was written by a release that keeps no ledger counts as documents without events.
struct Ledger {
    using Count = DeliveryReport::Count;

    Count open;       ///< in batches that are not handed over; `documents` counts the batches' rows
    Count waiting;    ///< in documents that are stored: under way, or to be sent again
    Count delivered;  ///< the collector has them

    /// The collector will not take them, by the class of its answer.
    struct Refused {
        Count status4xx;  ///< 400 to 499, but 401 and 429
        Count status3xx;  ///< a redirect, which is not followed
        Count other;      ///< an answer below 200
        [[nodiscard]] Count total() const;
        bool operator==(const Refused&) const = default;
    } refused;

    /// What will not arrive, by the reason.
    struct GivenUp {
        Count attempts;        ///< sent again too often
        Count age;             ///< older than `maximumAge`
        Count size;            ///< over `maximumBytesOnDisk`, and the oldest
        Count payloadMissing;  ///< the payload file had gone or was empty
        Count forgotten;       ///< `SessionManager::forget`
        [[nodiscard]] Count total() const;
        bool operator==(const GivenUp&) const = default;
    } givenUp;

    /// The row was removed by a program that keeps no ledger: it was delivered, refused or given up.
    Count unknown;

    Count sentAgain;  ///< attempts that have failed and were followed, or will be, by another; no part of the sum

    /// Submissions that were not accepted, and are in no sum. They are kept in memory until a document or the session
    /// ends; a kill loses those.
    struct NotAccepted {
        std::int64_t noSession = 0;
        std::int64_t missingData = 0;
        std::int64_t encoding = 0;
        std::int64_t notRecording = 0;
        std::int64_t other = 0;  ///< the host's own code threw
        bool operator==(const NotAccepted&) const = default;
    } notAccepted;

    /// Of this run alone: events that the processor took, counted as they came.
    std::int64_t acceptedInRun = 0;
    /// Of this run alone: how many of those are neither in its batches nor in documents nor forgotten. It is 0.
    std::int64_t unaccounted = 0;

    /// All that was ever accepted: the sum of what became of it.
    [[nodiscard]] Count accepted() const;

    bool operator==(const Ledger&) const = default;
};

}  // namespace corvane
