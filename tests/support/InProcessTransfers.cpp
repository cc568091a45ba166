#include <corvane/Platform/InProcessTransferSession.h>

// Part of every test program: a test that wants a transfer agent opens its background sessions itself, with a directory
// of its own, so that none is left behind by one that does not.

namespace corvane::test {
namespace {
[[maybe_unused]] const bool isSet = [] {
    TransferSession::setFactory(InProcessTransferSession::factory());
    return true;
}();
}  // namespace
}  // namespace corvane::test
