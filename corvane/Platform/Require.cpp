#include <corvane/Platform/Require.h>

#include <cstdio>
#include <cstdlib>

namespace corvane {

void fail(std::string_view message) noexcept {
    std::fprintf(stderr, "corvane: %.*s\n", static_cast<int>(message.size()), message.data());
    std::fflush(stderr);
    std::abort();
}

}  // namespace corvane
