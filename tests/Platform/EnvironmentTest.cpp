#include <corvane/Platform/Bundle.h>
#include <corvane/Platform/Date.h>
#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Platform/Error.h>
#include <corvane/Platform/MainQueue.h>
#include <corvane/Testing/ProcessSettings.h>

#include "tests/support/Testing.h"

#include <cmath>

namespace corvane::test {
namespace {

TEST(DocumentsDirectory, IsTheApplicationsOwnAndPrivate) {
    TemporaryDocuments temporary;
    const char* before = std::getenv("XDG_DATA_HOME");
    const std::string saved = before ? before : "";
    setenv("XDG_DATA_HOME", temporary.path().c_str(), 1);
    DocumentsDirectory::set({});
    EXPECT_EQ(DocumentsDirectory::create(), temporary / "test_Platform/Documents");
    EXPECT_EQ(permissions(temporary / "test_Platform"), 0700u);
    EXPECT_EQ(permissions(temporary / "test_Platform/Documents"), 0700u);
    before ? setenv("XDG_DATA_HOME", saved.c_str(), 1) : unsetenv("XDG_DATA_HOME");

    writeFile(temporary / "file", "");
    DocumentsDirectory::set(temporary / "file/Documents");
    EXPECT_THROW(DocumentsDirectory::create(), SystemError);
}

TEST(Bundle, ReadsEntriesAndSkipsWhatIsNone) {
    TemporaryDocuments temporary;
    writeFile(temporary / "app.bundle", "BundleName=A=B\nnonsense\n=\nBundleVersion=7\n");
    const Bundle bundle = Bundle::fromFile(temporary / "app.bundle");
    EXPECT_EQ(bundle.entry(Bundle::nameKey), "A=B");
    EXPECT_EQ(bundle.entry(Bundle::versionKey), "7");
    EXPECT_FALSE(bundle.entry(Bundle::identifierKey));
    EXPECT_FALSE(Bundle::fromFile(temporary / "none").entry(Bundle::nameKey));
}

TEST(Date, ConvertsOnlyWhatADateCanHold) {
    EXPECT_EQ(dateFromMilliseconds(-1500), Date(-1500ms));
    EXPECT_FALSE(dateFromMilliseconds(std::numeric_limits<std::int64_t>::max()));
    EXPECT_EQ(dateFromSeconds(secondsSince1970(Date(-250ms))), Date(-250ms));
    for (const double seconds : {1e300, -1e300, std::nan(""), HUGE_VAL}) EXPECT_FALSE(dateFromSeconds(seconds));
    EXPECT_EQ(description(Date(-1ms)), "1969-12-31 23:59:59 +0000");
}

TEST(Log, ShowsErrorsHidesPrivateArgumentsWhenAskedAndPrintsNothingThatSteersATerminal) {
    EXPECT_TRUE(Log::shared().isEnabled(LogLevel::error));
    EXPECT_FALSE(Log::shared().isEnabled(LogLevel::default_));
    const test::CapturedLog log;
    const std::string foreign = "a\x1b[31m\r\n\x7f\xff\xc2\x9b\xe2\x82\xac\xc3";
    Log::shared().error("%{public}@", foreign);
    Log::shared().error("%@", LogLines{foreign});
    EXPECT_EQ(log.lines()[0].message, "a\\x1b[31m\\x0d\\n\\x7f\\xff\\xc2\\x9b\xe2\x82\xac\\xc3");
    EXPECT_EQ(log.lines()[1].message, "a\\x1b[31m\\x0d\n\\x7f\\xff\\xc2\\x9b\xe2\x82\xac\\xc3");
    Log::shared().setHidesPrivateArguments(true);
    Log::shared().error("a=%{public}@ b=%@ n=%ld 100%", "x", "secret", 7);
    Log::shared().setHidesPrivateArguments(false);
    EXPECT_EQ(log.lines()[2].message, "a=x b=<private> n=7 100%");
}

TEST(TransferSession, AFactoryThatGoesMaySetAnother) {
    struct SetsAnother {
        ~SetsAnother() { TransferSession::setFactory(nullptr); }
    };
    ProcessSettings settings;
    settings.setTransfers([held = std::make_shared<SetsAnother>()](auto&&...) { return nullptr; });
    settings.setTransfers(nullptr);
}

TEST(MainQueue, RunsOnTheHostsExecutorOrOnItsOwnQueueWhenThatFails) {
    std::promise<int> ran;
    ProcessSettings settings;
    settings.setMainQueue([](const std::function<void()>&) { throw std::runtime_error("no loop"); });
    MainQueue::async([&] { ran.set_value(7); });
    EXPECT_EQ(ran.get_future().get(), 7);
    std::function<void()> posted;
    settings.setMainQueue([&](std::function<void()> task) { posted = std::move(task); });
    MainQueue::async([] { throw 1; });
    EXPECT_NO_THROW(posted());
}

}  // namespace
}  // namespace corvane::test
