// Prints the event that typed declarations make of the data that ValuesTest has, too.

#include <corvane/Testing/RecordingProcessor.h>
#include <corvane/corvane.h>

#include <bit>
#include <cmath>
#include <cstdio>

using namespace corvane;

namespace {

enum class Quality { standard, high };

std::string_view toText(Quality quality) {
    return quality == Quality::high ? "high" : "standard";
}

struct Artist {
    std::string name;
    std::optional<std::string> label;
};
struct Track {
    std::optional<std::string> subtitle;
    std::string title;
    bool isLive = false;
    std::int64_t plays = 0;
    std::uint64_t bytes = 0;
    Date released;
    std::chrono::microseconds length{};
    Quality quality{};
    std::vector<Artist> artists;
    std::map<std::string, std::optional<int>> ranks;
    std::vector<double> samples;
};
struct Played {
    EventProperty<Track> track = required;
    EventProperty<Artist> guest = optional;
};

// Of every magnitude.
std::vector<double> samples() {
    std::vector<double> found{0.0,  -0.0, 1.0,  1e5,  123456.0, 0.1,
                              1e-4, 1e16, 1e22, 1e23, 5e-324,   1.7976931348623157e308};
    std::uint64_t bits = 1;
    while (found.size() < 1000) {
        bits = bits * 6364136223846793005u + 1442695040888963407u;
        if (const auto value = std::bit_cast<double>(bits); std::isfinite(value)) found.push_back(value);
    }
    return found;
}

}  // namespace

int main() {
    SessionManager sessions;
    const auto recording = std::make_shared<test::RecordingProcessor>();
    sessions.processorManager()->add(recording);
    sessions.start(Session::Kind::userEvents());
    sessions.tracker()->push(Track{.subtitle = {},
                                   .title = "Pr\u00e9lude \"n\u00ba 1\"\\\n\t\x01\x7f\U0001F3B9",
                                   .isLive = true,
                                   .plays = INT64_MIN,
                                   .bytes = UINT64_MAX,
                                   .released = Date(std::chrono::microseconds(-1'500'900)),
                                   .length = std::chrono::microseconds(-2'999),
                                   .quality = Quality::high,
                                   .artists = {{"Z", {}}, {"", "L"}},
                                   .ranks = {{"a", 1}, {"b", {}}},
                                   .samples = samples()});
    sessions.tracker()->submit<Played>();
    sessions.endSync();
    std::puts(recording->only("Played").json().text().c_str());
}
