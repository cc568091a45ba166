#include <corvane/Transfer/TransferProxy.h>

#include <strings.h>

#include <cstdlib>
#include <initializer_list>

namespace corvane {

namespace {

std::string firstOf(std::initializer_list<const char*> names) {
    for (const char* name : names) {
        const char* value = std::getenv(name);
        if (value && *value) return value;
    }
    return {};
}

bool isSecure(std::string_view url) {
    constexpr std::string_view scheme = "https:";
    return url.size() >= scheme.size() && strncasecmp(url.data(), scheme.data(), scheme.size()) == 0;
}

}  // namespace

TransferProxy TransferProxy::ofEnvironment(std::string_view url) {
    return {isSecure(url) ? firstOf({"https_proxy", "HTTPS_PROXY", "all_proxy", "ALL_PROXY"})
                          : firstOf({"http_proxy", "all_proxy", "ALL_PROXY"}),
            firstOf({"no_proxy", "NO_PROXY"})};
}

}  // namespace corvane
