#include <corvane/Upload/gzip.h>

#include "tests/support/Documents.h"

#include <gtest/gtest.h>

#include <random>

namespace corvane::test {
namespace {

TEST(GZIP, CompressesWholeInputsOfAnySize) {
    std::mt19937 random(5);
    // Noise does not shrink, so the sizes lie on both sides of the steps in which the output grows.
    for (const std::size_t size : {1, 100, 16000, 16361, 16362, 16384, 32768, 200000}) {
        std::string noise(size, '\0');
        for (char& byte : noise) byte = static_cast<char>(random());
        noise[0] = 'n';
        EXPECT_EQ(gunzip(gzipCompressed(noise)), noise) << size;
    }
}

TEST(GZIP, LeavesNothingAndTheAlreadyCompressedAsTheyAre) {
    EXPECT_EQ(gzipCompressed(""), "");
    const auto once = gzipCompressed("text");
    EXPECT_TRUE(once.starts_with("\x1f\x8b"));
    EXPECT_EQ(gzipCompressed(once), once);
}

}  // namespace
}  // namespace corvane::test
