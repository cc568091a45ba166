#pragma once

#include <corvane/Export.h>
#include <corvane/Models/AnyDataEventEntry.h>
#include <corvane/Models/EventSubmit.h>
#include <corvane/Platform/Date.h>
#include <corvane/Tracker/EventSubmitResult.h>

#include <memory>
#include <source_location>
#include <utility>

namespace corvane {

class Tracker;

/// A handle on a tracker for code that runs on the tracker's queue: observer and transaction blocks.
///
/// It does not keep its tracker alive; once that is gone, every operation does nothing and calls no completion. The
/// operations mean what they mean on `Tracker`, but run inline: their effect, and a submission's completion, has
/// happened when the call returns.
///
/// Requires, for every operation: the caller is on the tracker's queue (otherwise the process is stopped).
class CORVANE_EXPORT AccessTracker {
  public:
    explicit AccessTracker(std::weak_ptr<Tracker> tracker) : tracker_(std::move(tracker)) {}

    template <class E>
    CORVANE_LOCAL void submit(EventSubmitCompletion completion = {}) const {
        submit(EventSubmit::actual<E>(), now(), {.completion = std::move(completion)});
    }
    template <class E>
    CORVANE_LOCAL void submit(SubmitOptions options) const {
        submit(EventSubmit::actual<E>(), now(), std::move(options));
    }
    template <class E>
    CORVANE_LOCAL void explicitSubmit(Date submitTime, EventSubmitCompletion completion = {}) const {
        submit(EventSubmit::actual<E>(), submitTime, {.completion = std::move(completion)});
    }

    template <class E>
    CORVANE_LOCAL void time(bool submitAndRestartWithSession = false) const {
        time(EventSubmit::actual<E>(), now(), submitAndRestartWithSession);
    }
    template <class E>
    CORVANE_LOCAL void explicitTime(Date startTime) const {
        time(EventSubmit::actual<E>(), startTime, false);
    }

    template <class D>
    CORVANE_LOCAL void push(D data, DataEventTraits traits = {},
                            std::source_location where = std::source_location::current()) const {
        if constexpr (detail::check(detail::searchDataEvent<detail::Use::later, D>())) {
            push({typeName<D>(), AnyDataEvent(std::move(data)), traits, where.file_name(), where.line()});
        }
    }
    template <class D>
    CORVANE_LOCAL void pop() const {
        pop(typeName<D>(), DataType::of<D>());
    }

    // The same for events and data that are known by declaration and name.
    void submit(const EventSubmit& event, Date submitTime, const SubmitOptions& options) const;
    void time(const EventSubmit& event, Date startTime, bool submitAndRestartWithSession) const;
    void push(AnyDataEventEntry entry) const;
    void pop(std::string_view key, DataType type) const;

    /// Whether the operations may be called here: the caller is on the tracker's queue, or the tracker is gone and they
    /// do nothing. Any thread.
    [[nodiscard]] bool isUsable() const;

    /// The tracker, or nullptr when it is gone.
    [[nodiscard]] std::shared_ptr<Tracker> tracker() const { return tracker_.lock(); }

  private:
    std::weak_ptr<Tracker> tracker_;
};

}  // namespace corvane
