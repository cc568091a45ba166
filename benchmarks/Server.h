#pragma once

#include <sys/types.h>

#include <string>

namespace corvane::bench {

/// A server on a free port of the loopback address, in a process of its own so that its CPU time is not counted. It
/// answers 200 to everything, except that requests to "/never" get no answer. Make it before there are threads; it
/// ends with this object, or with the process.
class Server {
  public:
    enum class Manner {
        answers,
        trickles,    ///< takes one byte a second
        refusesOne,  ///< answers 503 to the first body that came, whenever it comes
    };

    explicit Server(Manner manner = Manner::answers);
    Server(const Server&) = delete;
    Server& operator=(const Server&) = delete;
    ~Server();

    [[nodiscard]] const std::string& url() const { return url_; }

  private:
    pid_t process_ = 0;
    std::string url_;
};

}  // namespace corvane::bench
