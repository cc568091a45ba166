#include <corvane/Context/Surroundings.h>

namespace corvane {

std::optional<DisplayInfo> detail::display(const Surroundings& around) {
    // A host that finds both windows of the newer kind, which brings the older one along for others.
    if (around.variable("WAYLAND_DISPLAY")) return DisplayInfo{"wayland"};
    if (around.variable("DISPLAY")) return DisplayInfo{"x11"};
    return std::nullopt;
}

std::optional<DisplayInfo> DisplayInfo::current() {
    return detail::display({});
}

}  // namespace corvane
