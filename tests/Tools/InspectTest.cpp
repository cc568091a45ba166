#include <corvane/Agent/AgentDirectory.h>
#include <corvane/Agent/TransferSubmission.h>
#include <corvane/Platform/PrivateFile.h>
#include <corvane/Testing/ScriptedServer.h>
#include <corvane/Testing/TemporaryDocuments.h>
#include <gtest/gtest.h>
#include <sys/wait.h>

#include <cstdio>
#include <filesystem>
#include <map>
#include <vector>

#include "tests/Integration/Application.h"
#include "tests/support/Testing.h"

namespace corvane::test {
namespace {

namespace fs = std::filesystem;

struct Ran {
    std::string output;
    int status = 0;
    [[nodiscard]] JSON json() const { return JSON(output); }
};

// Errors come with the output.
Ran inspect(const std::string& arguments) {
    Ran ran;
    FILE* output = popen(("exec " CORVANE_INSPECT " " + arguments + " 2>&1").c_str(), "re");
    if (!output) throw std::runtime_error("cannot run " CORVANE_INSPECT);
    char buffer[4096];
    while (const std::size_t count = fread(buffer, 1, sizeof buffer, output)) ran.output.append(buffer, count);
    const int status = pclose(output);
    ran.status = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    return ran;
}

bool holds(const std::string& text, const std::string& part) {
    return text.find(part) != std::string::npos;
}

class InspectTest : public ::testing::Test {
  protected:
    // What a host has left that could not deliver: three documents, and two events that are open.
    void recordForServerThatIsAway() {
        ScriptedServer away;
        for (int i = 0; i < 3; ++i) away.script(ScriptedServer::Reply::status(503));
        Application app(away.url("/in"), 2);
        app.submit(6);
        app.wait();
        app.submit(1);
        app.abandon();
    }
    [[nodiscard]] std::string directory() const { return documents.path().string(); }
    [[nodiscard]] JSON status() const { return inspect("--format json " + directory()).json(); }
    // The index of a log is no part of what is stored, and changes for readers as well.
    [[nodiscard]] std::map<std::string, std::string> files() const {
        std::map<std::string, std::string> files;
        for (const auto& entry : fs::recursive_directory_iterator(documents.path())) {
            if (!entry.is_regular_file() || entry.path().extension() == ".db-shm") continue;
            files[entry.path()] = readWholeFile(entry.path());
        }
        return files;
    }

    const TemporaryDocuments documents;
};

TEST_F(InspectTest, ShowsWhatIsStoredAndChangesNothing) {
    recordForServerThatIsAway();
    const auto before = files();
    const JSON endpoint = status()["endpoints"][0];
    EXPECT_EQ(endpoint["name"].string(), "main");
    ASSERT_EQ(endpoint["documents"].array()->size(), 3u);
    EXPECT_EQ(endpoint["batches"][0]["events"].integer(), 1);
    EXPECT_EQ(endpoint["ledger"]["sent again"]["events"].integer(), 6);
    const JSON document = endpoint["documents"][0];
    EXPECT_EQ(document["events"].integer(), 2);
    EXPECT_EQ(document["runsTried"].integer(), 1);
    EXPECT_EQ(document["hasPayload"].bool_(), true);
    const std::string identifier = *document["identifier"].string();

    const auto text = inspect("documents --color always " + directory());
    EXPECT_TRUE(holds(text.output, "\x1b[1m") && holds(text.output, identifier)) << text.output;
    EXPECT_TRUE(holds(text.output, "was tried in 1 run")) << text.output;
    EXPECT_FALSE(holds(inspect(directory()).output, "\x1b"));
    const JSON shown = inspect("show " + directory() + " " + identifier.substr(0, 13)).json();
    EXPECT_EQ(shown["metadata"]["identifier"].string(), identifier);
    EXPECT_EQ(shown["data"]["events"][1]["data"]["screen"]["name"].string(), "home");
    EXPECT_TRUE(holds(inspect("verify " + directory()).output, "3 documents, all good"));

    ScriptedServer server;
    EXPECT_EQ(inspect("send " + directory() + " " + identifier + " " + server.url("/by-hand")).status, 0);
    ASSERT_TRUE(server.waitForRequests(1));
    EXPECT_EQ(server.documents()[0]["metadata"]["identifier"].string(), identifier);
    EXPECT_EQ(server.requests()[0].header("X-Veskar-ActionSignature").size(), 88u);
    server.script(ScriptedServer::Reply::status(400));
    EXPECT_EQ(inspect("send " + directory() + " " + identifier + " " + server.url("/")).status, 1);
    EXPECT_EQ(files(), before);
}

TEST_F(InspectTest, ReadsBesideAHostAndWhatTheAgentHas) {
    TransferSession::setFactory(BackgroundTransferSession::factory({.program = CORVANE_TRANSFERD}));
    {
        Application app("http://127.0.0.1:9/in", 2);
        app.submit(3);
        app.drain();
        const JSON now = status();
        EXPECT_EQ(now["endpoints"][0]["batches"][0]["events"].integer(), 1);
        EXPECT_EQ(now["endpoints"][0]["documents"][0]["isWithAgent"].bool_(), true) << now.text();
        EXPECT_EQ(now["agent"]["tasks"][0]["url"].string(), "http://127.0.0.1:9/in");
        EXPECT_TRUE(holds(inspect("verify " + directory()).output, "signature  good"));
        std::promise<void> kept;
        app.sessions.setRecording(false, [&](const AnyError*) { kept.set_value(); });
        kept.get_future().wait();
        EXPECT_EQ(status()["isRecording"].bool_(), false);
    }
    TransferSession::setFactory(InProcessTransferSession::factory());
}

TEST_F(InspectTest, SaysWhatCannotBeReadAndGoesOn) {
    recordForServerThatIsAway();
    const auto identifier = *status()["endpoints"][0]["documents"][0]["identifier"].string();
    const auto dropbox = documents / "com.veskar.corvane.main.upload-dropbox";
    replacePrivateFile(dropbox / identifier, "torn");
    replacePrivateFile(documents / "com.veskar.corvane.bad.db", "no database");
    const auto agent = documents / AgentDirectory::usualName;
    fs::create_directories(agent / "spool");
    replacePrivateFile(agent / "journal.db", "no journal");
    replacePrivateFile(agent / "spool" / TransferSubmission::newToken(), "\x1b[31m");

    const auto ran = inspect(directory());
    EXPECT_EQ(ran.status, 1);
    for (const char* part : {"bad.db: file is not a database", "journal.db: file is not a database", "spool/",
                             "stored, to be delivered 6 events in 3 documents"}) {
        EXPECT_TRUE(holds(ran.output, part)) << part << "\n" << ran.output;
    }
    EXPECT_EQ(status()["problems"].array()->size(), 3u);
    const auto verified = inspect("verify " + directory());
    EXPECT_EQ(verified.status, 1);
    EXPECT_TRUE(holds(verified.output, "gzip       ")) << verified.output;
    fs::remove(dropbox / identifier);
    EXPECT_TRUE(holds(inspect("documents " + directory()).output, "its payload is missing or empty"));

    for (const auto& [arguments, status, message] :
         std::vector<std::tuple<std::string, int, std::string>>{{"", 2, "a documents directory is missing"},
                                                                {"/nowhere", 1, "cannot be read"},
                                                                {"show " + directory(), 2, "takes other arguments"},
                                                                {"show " + directory() + " zz", 1, "no document zz"},
                                                                {"--format xml " + directory(), 2, "--format takes"},
                                                                {"--color red " + directory(), 2, "--color takes"},
                                                                {"--bad", 2, "unknown option"},
                                                                {directory() + " > /dev/full", 3, ""},
                                                                {"--help", 0, "usage:"},
                                                                {"--version", 0, "corvane-inspect "}}) {
        const auto wrong = inspect(arguments);
        EXPECT_EQ(wrong.status, status) << arguments;
        EXPECT_TRUE(holds(wrong.output, message)) << arguments << ": " << wrong.output;
    }
}

}  // namespace
}  // namespace corvane::test
