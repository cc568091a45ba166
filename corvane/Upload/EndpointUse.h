#pragma once

#include <corvane/Upload/Endpoint.h>

#include <string>

namespace corvane {

/// Marks an endpoint's files as being in use, for as long as it lives.
///
/// Two users of one endpoint in one process lose nothing, but each sends again what the other has under way, and a host
/// hardly ever means it: the second one is told so with an error line. Safe from any thread.
class EndpointUse {
  public:
    explicit EndpointUse(const Endpoint& endpoint);
    EndpointUse(const EndpointUse&) = delete;
    EndpointUse& operator=(const EndpointUse&) = delete;
    ~EndpointUse();

  private:
    const std::string key_;
};

}  // namespace corvane
