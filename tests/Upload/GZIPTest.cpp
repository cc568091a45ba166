#include <corvane/Upload/gzip.h>

#include "tests/support/Testing.h"

#include <random>

namespace corvane::test {
namespace {

TEST(GZIP, CompressesWholeInputsOfAnySizeOnceAndLeavesNothingAsItIs) {
    std::mt19937 random(5);
    // Noise does not shrink, so the sizes lie on both sides of the steps in which the output grows.
    for (const std::size_t size : {1, 100, 16000, 16361, 16362, 16384, 32768, 200000}) {
        std::string noise(size, '\0');
        for (char& byte : noise) byte = static_cast<char>(random());
        noise[0] = 'n';
        const auto once = gzipCompressed(noise);
        ScriptedServer::Request received;
        received.body = once;
        EXPECT_EQ(received.content(), noise) << size;
        EXPECT_EQ(gzipCompressed(once), once);
    }
    EXPECT_EQ(gzipCompressed(""), "");
}

}  // namespace
}  // namespace corvane::test
