#include <examples/replay/LineReader.h>

#include <sstream>

#include "tests/support/Testing.h"

namespace replay {
namespace {

TEST(LineReader, ALineWithoutEndIsCutAndTheNextOneIsRead) {
    std::istringstream stream(std::string(5'000'000, 'x') + "\n\nwith\r\n" + std::string(5'000'000, 'y'));
    LineReader reader(stream);
    ASSERT_TRUE(reader.next());
    EXPECT_TRUE(reader.isTooLong());
    ASSERT_TRUE(reader.next());
    EXPECT_FALSE(reader.isTooLong());
    EXPECT_EQ(reader.line(), "");
    ASSERT_TRUE(reader.next());
    EXPECT_EQ(reader.line(), "with");
    ASSERT_TRUE(reader.next());
    EXPECT_TRUE(reader.isTooLong());
    EXPECT_FALSE(reader.next());
    EXPECT_EQ(reader.bytesRead(), 10'000'008);
}

}  // namespace
}  // namespace replay
