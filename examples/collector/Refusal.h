#pragma once

#include <stdexcept>
#include <string>

namespace collector {

/// A request that is not accepted: the status of the answer, and the reason for its body.
class Refusal : public std::runtime_error {
  public:
    Refusal(int status, const std::string& reason) : std::runtime_error(reason), status_(status) {}
    [[nodiscard]] int status() const { return status_; }

  private:
    int status_;
};

}  // namespace collector
