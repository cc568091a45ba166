#include <examples/replay/LineReader.h>

#include <sstream>

#include "tests/support/Testing.h"

namespace replay {
namespace {

TEST(LineReader, ReadsLinesOfEveryKind) {
    const std::string text("one\n\ntwo\r\nwith\0NUL\nlast", 23);
    std::istringstream stream(text);
    LineReader reader(stream);
    for (const std::string& expected :
         {std::string("one"), std::string(), std::string("two"), std::string("with\0NUL", 8), std::string("last")}) {
        ASSERT_TRUE(reader.next());
        EXPECT_EQ(reader.line(), expected);
        EXPECT_FALSE(reader.isTooLong());
    }
    EXPECT_FALSE(reader.next());
    EXPECT_EQ(reader.bytesRead(), 23);
}

TEST(LineReader, ALineWithoutEndIsCutAndTheNextOneIsRead) {
    std::istringstream stream(std::string(5'000'000, 'x') + "\nnext\n" + std::string(5'000'000, 'y'));
    LineReader reader(stream);
    ASSERT_TRUE(reader.next());
    EXPECT_TRUE(reader.isTooLong());
    ASSERT_TRUE(reader.next());
    EXPECT_FALSE(reader.isTooLong());
    EXPECT_EQ(reader.line(), "next");
    ASSERT_TRUE(reader.next());
    EXPECT_TRUE(reader.isTooLong());
    EXPECT_FALSE(reader.next());
    EXPECT_EQ(reader.bytesRead(), 10'000'006);
}

}  // namespace
}  // namespace replay
