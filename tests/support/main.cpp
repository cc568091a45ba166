// The main function of every test program.
#include "tests/support/ProcessSettings.h"

#include <gtest/gtest.h>

namespace {

class RestoresSettings final : public ::testing::EmptyTestEventListener {
    void OnTestStart(const ::testing::TestInfo&) override { corvane::test::ProcessSettings::restoreAll(); }
};

}  // namespace

int main(int argc, char** argv) {
    ::testing::InitGoogleTest(&argc, argv);
    GTEST_FLAG_SET(death_test_style, "threadsafe");  // forks are safe in no process with threads
    ::testing::UnitTest::GetInstance()->listeners().Append(new RestoresSettings);
    return RUN_ALL_TESTS();
}
