#include <corvane/Context/Surroundings.h>

#include <unistd.h>

#include <charconv>
#include <ctime>

namespace corvane {

namespace {

// The 22nd field of the line: when the process was started, in ticks since the system was. The second one is the name
// of the program in parentheses, in which anything may stand.
std::optional<std::int64_t> startTicks(std::string_view line) {
    const auto name = line.rfind(')');
    if (name == std::string_view::npos) return std::nullopt;
    line.remove_prefix(name + 1);
    for (int field = 2; field < 22; ++field) {
        const auto blank = line.find(' ');
        if (blank == std::string_view::npos) return std::nullopt;
        line.remove_prefix(blank + 1);
    }
    std::int64_t ticks = 0;
    const auto read = std::from_chars(line.data(), line.data() + line.size(), ticks);
    if (read.ec != std::errc() || ticks < 0) return std::nullopt;
    return ticks;
}

bool hasSignsOfContainer(const detail::Surroundings& around) {
    for (const char* file : {"run/.containerenv", ".dockerenv", "run/systemd/container"}) {
        if (around.exists(file)) return true;
    }
    return around.variable("container") || around.variable("KUBERNETES_SERVICE_HOST");
}

}  // namespace

ProcessInfo detail::process(const Surroundings& around, std::int64_t parent, Date now,
                            std::chrono::nanoseconds sinceBoot, std::int64_t ticks) {
    ProcessInfo process;
    // In seconds as floating point: numbers of a broken line overflow nothing.
    if (const auto started = startTicks(around.file("proc/self/stat").value_or("")); started && ticks > 0) {
        const double age = std::chrono::duration<double>(sinceBoot).count() -
                           static_cast<double>(*started) / static_cast<double>(ticks);
        process.start = dateFromSeconds(secondsSince1970(now) - age);
    }
    const std::string name = around.file("proc/" + std::to_string(parent) + "/comm").value_or("");
    process.parent = contextText(std::string_view(name).substr(0, name.find('\n')));
    process.isInContainer = hasSignsOfContainer(around);
    return process;
}

ProcessInfo ProcessInfo::current() {
    timespec time{};
    ::clock_gettime(CLOCK_BOOTTIME, &time);
    const auto sinceBoot = std::chrono::seconds(time.tv_sec) + std::chrono::nanoseconds(time.tv_nsec);
    return detail::process({}, ::getppid(), now(), sinceBoot, ::sysconf(_SC_CLK_TCK));
}

}  // namespace corvane
