// The same host without the library.

#include <unistd.h>

#include <cstdio>
#include <string>

int main(int argc, char** argv) {
    if (argc != 3) return 2;
    const std::string directory = argv[1];
    std::puts(directory.empty() ? "" : "ready");
    std::fflush(stdout);
    pause();
}
