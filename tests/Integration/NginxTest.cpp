#include "tests/Integration/Application.h"
#include "tests/support/Testing.h"

#include <corvane/Transfer/HTTPSession.h>

#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

namespace corvane::test {
namespace {

/// nginx as its packages install it, with a configuration of the test's own, storing what is PUT under "stored".
class Nginx {
  public:
    explicit Nginx(const std::filesystem::path& directory) : url(ScriptedServer().url("")) {  // free again
        std::filesystem::create_directories(directory / "stored");
        const std::string at = directory.string();
        std::string http = "http { access_log off; client_body_temp_path " + at + "/body; ";
        for (const std::string kind : {"proxy", "fastcgi", "uwsgi", "scgi"}) {
            http += kind + "_temp_path " + at + "/" + kind + "; ";
        }
        writeFile(directory / "conf", (getuid() == 0 ? "user root; " : "") + std::string("daemon off; events {} pid ") +
                                          at + "/pid; error_log " + at + "/error.log; " + http + "server { listen " +
                                          url.substr(7) + "; root " + at +
                                          "/stored; location / { dav_methods PUT; create_full_put_path on; } } }");
        process_ = fork();
        if (process_ != 0) return;
        setenv("PATH", "/usr/sbin:/usr/local/sbin:/usr/bin", 1);
        execlp("nginx", "nginx", "-c", (at + "/conf").c_str(), "-e", (at + "/error.log").c_str(), nullptr);
        _exit(127);
    }
    ~Nginx() {
        kill(process_, SIGTERM);
        waitpid(process_, nullptr, 0);
    }

    /// Waits until it answers; false when it has ended.
    [[nodiscard]] bool isUp() const {
        HTTPSession session;
        while (waitpid(process_, nullptr, WNOHANG) == 0) {
            const auto answered = std::make_shared<std::promise<bool>>();
            session.get(url, [answered](const auto& response, const auto&) { answered->set_value(bool(response)); });
            if (answered->get_future().get()) return true;
        }
        return false;
    }

    const std::string url;

  private:
    pid_t process_ = -1;
};

TEST(Nginx, StoresADocumentThatGzipReadsBack) {
    TemporaryDocuments documents;
    const Nginx nginx(documents / "nginx");
    ASSERT_TRUE(nginx.isUp()) << readFile(documents / "nginx/error.log");
    Application application(nginx.url + "/deep/document.gz", 50, true);
    application.submit(40);
    application.sessions.endSync();
    ASSERT_EQ(application.wait().delivered, (DeliveryReport::Count{40, 1}));

    const std::string stored = (documents / "nginx/stored/deep/document.gz").string();
    ASSERT_EQ(std::system(("gzip -dc '" + stored + "' > '" + stored + ".json'").c_str()), 0);
    const std::string document = readFile(stored + ".json");
    std::string sent;
    for (const auto& copy :
         std::filesystem::directory_iterator(documents / "com.veskar.corvane.main.upload-dropbox.debugging")) {
        if (copy.path().string().ends_with(".request.json")) sent = readFile(copy.path());
    }
    EXPECT_EQ(document, sent);
    EXPECT_EQ(JSON(document)["data"]["events"].array()->size(), 40u);
}

}  // namespace
}  // namespace corvane::test
