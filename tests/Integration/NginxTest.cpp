#include "tests/Integration/Application.h"

#include "tests/support/CapturedLog.h"
#include "tests/support/TemporaryDocuments.h"

#include <arpa/inet.h>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <cstdlib>
#include <memory>

namespace corvane::test {
namespace {

sockaddr_in loopback(int port) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    address.sin_port = htons(static_cast<std::uint16_t>(port));
    return address;
}

int freePort() {
    const int probe = socket(AF_INET, SOCK_STREAM, 0);
    sockaddr_in address = loopback(0);
    socklen_t size = sizeof address;
    EXPECT_EQ(bind(probe, reinterpret_cast<sockaddr*>(&address), size), 0);
    EXPECT_EQ(getsockname(probe, reinterpret_cast<sockaddr*>(&address), &size), 0);
    close(probe);
    return ntohs(address.sin_port);
}

/// nginx as its packages install it, with a configuration of the test's own, storing what is PUT under "stored".
class Nginx {
  public:
    explicit Nginx(const std::filesystem::path& directory) : directory_(directory), port_(freePort()) {
        std::filesystem::create_directories(directory_ / "stored");
        const std::string at = directory_.string();
        writeFile(directory_ / "nginx.conf",
                  "daemon off; pid " + at + "/pid; error_log " + at +
                      "/error.log; events {}\nhttp { access_log off; client_body_temp_path " + at +
                      "/body; proxy_temp_path " + at + "/proxy; fastcgi_temp_path " + at +
                      "/fastcgi; uwsgi_temp_path " + at + "/uwsgi; scgi_temp_path " + at +
                      "/scgi;\n  server { listen 127.0.0.1:" + std::to_string(port_) + "; root " + at +
                      "/stored; location / { dav_methods PUT; create_full_put_path on; dav_access user:rw; } } }\n");
        if (getuid() == 0) writeFile(directory_ / "nginx.conf", "user root;\n" + readFile(directory_ / "nginx.conf"));
        process_ = fork();
        if (process_ == 0) {
            execlp("nginx", "nginx", "-c", (at + "/nginx.conf").c_str(), "-e", (at + "/error.log").c_str(), nullptr);
            execl("/usr/sbin/nginx", "nginx", "-c", (at + "/nginx.conf").c_str(), "-e", (at + "/error.log").c_str(),
                  nullptr);
            _exit(127);
        }
    }
    ~Nginx() {
        kill(process_, SIGTERM);
        waitpid(process_, nullptr, 0);
    }

    /// Waits until it accepts connections.
    [[nodiscard]] bool isUp() const {
        const auto deadline = std::chrono::steady_clock::now() + 10s;
        const sockaddr_in address = loopback(port_);
        while (std::chrono::steady_clock::now() < deadline && waitpid(process_, nullptr, WNOHANG) == 0) {
            const int probe = socket(AF_INET, SOCK_STREAM, 0);
            const bool accepted = connect(probe, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0;
            close(probe);
            if (accepted) return true;
        }
        return false;
    }
    [[nodiscard]] std::string url(const std::string& path) const {
        return "http://127.0.0.1:" + std::to_string(port_) + path;
    }
    [[nodiscard]] std::filesystem::path stored(const std::string& name) const { return directory_ / "stored" / name; }

  private:
    std::filesystem::path directory_;
    int port_;
    pid_t process_ = -1;
};

struct Output {
    int status;
    std::string text;
};

Output shell(const std::string& command) {
    const auto closer = [](FILE* pipe) { pclose(pipe); };
    std::unique_ptr<FILE, decltype(closer)> pipe(popen(command.c_str(), "r"), closer);
    std::string text;
    std::array<char, 4096> buffer;
    for (std::size_t n = 0; (n = fread(buffer.data(), 1, buffer.size(), pipe.get())) > 0;)
        text.append(buffer.data(), n);
    return {pclose(pipe.release()), text};
}

TEST(Nginx, StoresADocumentThatGzipReadsBack) {
    CapturedLog log;
    TemporaryDocuments documents;
    const Nginx nginx(documents / "nginx");
    ASSERT_TRUE(nginx.isUp()) << readFile(documents / "nginx/error.log");

    Application application(nginx.url("/deep/document.gz"), 50, true);
    application.submit(40);
    application.sessions.endSync();
    ASSERT_EQ(application.wait().delivered, (DeliveryReport::Count{40, 1}));

    const std::string file = nginx.stored("deep/document.gz").string();
    EXPECT_EQ(shell("gzip -t '" + file + "' 2>&1").status, 0);
    const Output document = shell("zcat '" + file + "'");
    EXPECT_EQ(document.status, 0);
    const auto copies = documents / "com.veskar.corvane.main.upload-dropbox.debugging";
    std::string sent;
    for (const auto& copy : std::filesystem::directory_iterator(copies)) {
        if (copy.path().string().ends_with(".request.json")) sent = readFile(copy.path());
    }
    EXPECT_EQ(document.text, sent);
    EXPECT_EQ(JSON(document.text)["data"]["events"].array()->size(), 40u);
}

}  // namespace
}  // namespace corvane::test
