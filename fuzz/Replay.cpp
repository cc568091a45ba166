// Runs a fuzz target on files, without a fuzzer: what its corpus holds, and what once stopped it.
//
//     replay FILE-OR-DIRECTORY...

#include "fuzz/FuzzTarget.h"

#include <algorithm>
#include <cstdio>
#include <exception>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

int main(int argc, char** argv) {
    std::vector<std::filesystem::path> files;
    for (const std::filesystem::path path : std::vector<std::string>(argv + 1, argv + argc)) {
        if (is_directory(path)) {
            files.insert(files.end(), std::filesystem::directory_iterator(path), {});
        } else {
            files.push_back(path);
        }
    }
    std::sort(files.begin(), files.end());
    for (const auto& path : files) {
        std::fprintf(stderr, "%s\n", path.c_str());  // the last line before a stop
        std::ifstream file(path, std::ios::binary);
        const std::string bytes{std::istreambuf_iterator<char>(file), {}};
        if (!file) return 1;
        LLVMFuzzerTestOneInput(reinterpret_cast<const std::uint8_t*>(bytes.data()), bytes.size());
    }
    return files.empty() ? 1 : 0;
}
