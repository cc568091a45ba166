// The main function of every test program.

#include <corvane/Store/StoreConnection.h>
#include <corvane/Testing/ProcessSettings.h>

#include <gtest/gtest.h>

namespace {

class RestoresSettings final : public ::testing::EmptyTestEventListener {
    void OnTestStart(const ::testing::TestInfo&) override {
        corvane::test::ProcessSettings::restoreAll();
        corvane::StoreConnection::setBusyTimeout(std::chrono::seconds(5));
    }
};

}  // namespace

int main(int argc, char** argv) {
    ::testing::InitGoogleTest(&argc, argv);
    GTEST_FLAG_SET(death_test_style, "threadsafe");  // forks are safe in no process with threads
    ::testing::UnitTest::GetInstance()->listeners().Append(new RestoresSettings);
    return RUN_ALL_TESTS();
}
