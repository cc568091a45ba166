#include <corvane/Context/ApplicationInfo.h>
#include <corvane/Context/Surroundings.h>
#include <corvane/Platform/Bundle.h>

namespace corvane {

ApplicationInfo ApplicationInfo::current() {
    const Bundle bundle = Bundle::main();
    const auto entry = [&](std::string_view key) { return detail::contextText(bundle.entry(key).value_or("")); };
    auto name = entry(Bundle::nameKey);
    if (!name) name = detail::contextText(executablePath().filename().native());
    return {entry(Bundle::identifierKey), std::move(name), entry(Bundle::shortVersionKey), entry(Bundle::versionKey)};
}

}  // namespace corvane
