// Says what has changed from one catalogue of events to another, for people and for the automatic build of a host.

#include <corvane/Catalogue/CatalogueComparison.h>

#include <algorithm>
#include <cstdio>
#include <exception>
#include <string>

namespace {

constexpr auto usage =
    "usage: compare_catalogues BEFORE AFTER\n"
    "\n"
    "Compares two directories that corvane::writeCatalogue has written, and prints a line for each change. Exits with "
    "1\n"
    "when one of them breaks readers of the events, with 0 when none does, and with 2 when they cannot be compared.\n";

void print(const corvane::CatalogueChange& change) {
    std::printf("%s %s%s%s %s\n", change.isBreaking ? "breaks" : "      ", change.event.c_str(),
                change.path.empty() ? "" : ": ", change.path.c_str(), change.what.c_str());
}

int compare(const char* before, const char* after) {
    const auto changes = corvane::compareCatalogues(before, after);
    std::ranges::for_each(changes, print);
    return std::ranges::any_of(changes, &corvane::CatalogueChange::isBreaking) ? 1 : 0;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc == 2 && std::string(argv[1]) == "--help") return std::fputs(usage, stdout) < 0 ? 2 : 0;
    if (argc != 3) {
        std::fputs(usage, stderr);
        return 2;
    }
    try {
        return compare(argv[1], argv[2]);
    } catch (const std::exception& error) {
        std::fprintf(stderr, "compare_catalogues: %s\n", error.what());
        return 2;
    }
}
