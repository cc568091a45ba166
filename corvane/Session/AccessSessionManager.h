#pragma once

#include <corvane/Export.h>
#include <corvane/Models/AnyDataEventEntry.h>
#include <corvane/Models/SessionData.h>

#include <memory>
#include <source_location>
#include <utility>

namespace corvane {

class SessionCore;

/// A handle on the session manager for the length of a transaction block. Its operations run inline.
///
/// Requires, for every operation: the caller is on the session manager's queue (otherwise the process is stopped).
class CORVANE_EXPORT AccessSessionManager {
  public:
    explicit AccessSessionManager(std::shared_ptr<SessionCore> sessionManager);
    AccessSessionManager(const AccessSessionManager&) = default;
    AccessSessionManager& operator=(const AccessSessionManager&) = default;
    ~AccessSessionManager();

    [[nodiscard]] bool isActive() const;

    /// As `SessionManager::push`, done when it returns.
    template <class D>
    CORVANE_LOCAL void push(SessionData<D> data, DataEventTraits traits = {}, bool submitEventQueues = false,
                            std::source_location where = std::source_location::current()) {
        if constexpr (detail::check(detail::searchDataEvent<detail::Use::later, D>())) {
            push({typeName<SessionData<D>>(), AnyDataEvent(std::move(data)), traits, where.file_name(), where.line()},
                 submitEventQueues);
        }
    }

    /// The same for session data that is known by name.
    void push(AnyDataEventEntry entry, bool submitEventQueues);

  private:
    std::shared_ptr<SessionCore> sessionManager_;
};

}  // namespace corvane
