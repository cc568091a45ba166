#include <corvane/Context/Surroundings.h>

#include <sys/utsname.h>
#include <unistd.h>

#include <algorithm>
#include <bit>
#include <thread>

namespace corvane {

std::optional<std::int64_t> detail::memoryClass(std::uint64_t bytes) {
    if (bytes == 0) return std::nullopt;
    // Part of what is installed is the system's own: what is left of 16 GiB is still of their class.
    const std::uint64_t gibibytes = (bytes - 1) / (std::uint64_t{1} << 30) + 1;
    return static_cast<std::int64_t>(std::bit_ceil(std::min<std::uint64_t>(gibibytes, 128)));
}

MachineInfo MachineInfo::current() {
    constexpr unsigned mostCores = 256;
    MachineInfo machine;
    utsname names{};
    if (::uname(&names) == 0) machine.architecture = detail::contextText(names.machine);
    if (const unsigned cores = std::thread::hardware_concurrency(); cores > 0)
        machine.cores = std::min(cores, mostCores);
    const long pages = ::sysconf(_SC_PHYS_PAGES), page = ::sysconf(_SC_PAGESIZE);
    if (pages > 0 && page > 0) {
        machine.memoryClass = detail::memoryClass(static_cast<std::uint64_t>(pages) * static_cast<std::uint64_t>(page));
    }
    return machine;
}

}  // namespace corvane
