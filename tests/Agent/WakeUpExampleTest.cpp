#include "tests/Agent/AgentFixture.h"
#include "tests/Integration/HostProcess.h"

namespace corvane::test {
namespace {

class WakeUpExample : public AgentFixture {
  protected:
    // Where the example's agent is: in its documents directory, like any host's that does not say otherwise.
    WakeUpExample() { options.directory = documents / "com.veskar.corvane.transfer-agent"; }
};

TEST_F(WakeUpExample, EndsAtOnceAndIsWokenWhenItsDocumentIsThrough) {
    server.script(ScriptedServer::Reply::status(200).hold());
    const std::string url = server.url("/events"), directory = documents.path().string();
    EXPECT_TRUE(HostProcess::run({CORVANE_EXAMPLE, url, directory}).succeeded());
    ASSERT_TRUE(server.waitForRequests(1));
    server.release();
    const auto written = documents / "woken.txt";
    ASSERT_TRUE(eventually([&] { return readFile(written).ends_with("\n"); }, 20s));
    EXPECT_EQ(readFile(written),
              "com.veskar.corvane.upload-session: all events delivered, 1 documents delivered, 0 pending\n");
    EXPECT_EQ(server.requests().size(), 1u);
    // The woken one is nobody's child here; it must not meet the end of the agent.
    EXPECT_TRUE(eventually([&] { return processes(url + '\0' + directory) == 0; }));
}

}  // namespace
}  // namespace corvane::test
