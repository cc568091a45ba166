// Runs a fuzz target, without a fuzzer, on the files of some directories: its corpus, and what once stopped it.

#include "fuzz/FuzzTarget.h"

#include "tests/support/Files.h"

#include <cstdio>

int main(int argc, char** argv) {
    int count = 0;
    for (int i = 1; i < argc; ++i) {
        for (const auto& file : std::filesystem::directory_iterator(argv[i])) {
            std::fprintf(stderr, "%s\n", file.path().c_str());  // the last line before a stop
            const auto bytes = corvane::test::readFile(file.path());
            LLVMFuzzerTestOneInput(reinterpret_cast<const std::uint8_t*>(bytes.data()), bytes.size());
            ++count;
        }
    }
    return count > 0 ? 0 : 1;
}
