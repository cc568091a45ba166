#pragma once

#include <corvane/Models/Session.h>

#include <string>

namespace corvane {

/// What trackers see of the session that runs.
class ActiveSessionType {
  public:
    virtual ~ActiveSessionType() = default;

    [[nodiscard]] virtual const std::string& identifier() const = 0;
    [[nodiscard]] virtual const Session::Kind& kind() const = 0;
    [[nodiscard]] virtual Date startDate() const = 0;

  protected:
    ActiveSessionType() = default;
    ActiveSessionType(const ActiveSessionType&) = default;
    ActiveSessionType& operator=(const ActiveSessionType&) = default;
};

}  // namespace corvane
