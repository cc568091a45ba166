// What a host and its agent send each other, in whatever pieces it comes: frames, messages, outcomes, submissions.

#include <corvane/Agent/AgentMessage.h>
#include <corvane/Agent/FormatError.h>
#include <corvane/Agent/FrameSocket.h>
#include <corvane/Agent/OutcomeCodec.h>
#include <corvane/Agent/TransferSubmission.h>

#include "fuzz/FuzzTarget.h"

#include <sys/socket.h>
#include <unistd.h>

#include <vector>

namespace {

using namespace corvane;

constexpr const char* damaged = "the length is wrong";

/// The messages of a stream that comes in pieces; at its end `damaged` when nothing can be read behind the last.
std::vector<std::string> received(std::string_view stream, std::size_t piece) {
    static int pair[2] = {-1, -1};  // stays open: whatever was sent has been received
    if (pair[0] < 0) CORVANE_REQUIRE(socketpair(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK, 0, pair) == 0, "no sockets");
    FrameSocket frames{Descriptor(dup(pair[0]))};
    std::vector<std::string> messages;
    bool isReadable = true;
    for (; !stream.empty(); stream.remove_prefix(std::min(piece, stream.size()))) {
        const auto part = stream.substr(0, piece);
        CORVANE_REQUIRE(write(pair[1], part.data(), part.size()) == static_cast<ssize_t>(part.size()),
                        "nothing is sent");
        CORVANE_REQUIRE(frames.receive(), "the connection has ended");
        try {
            while (isReadable) {
                auto message = frames.next();
                if (!message) break;
                messages.push_back(*std::move(message));
            }
        } catch (const FormatError&) {
            messages.push_back(damaged);
            isReadable = false;
        }
    }
    return messages;
}

/// Whatever can be decoded gives its own bytes again, but for those behind them that a later version has added.
template <class Decode, class Encode>
void check(std::string_view bytes, const Decode& decode, const Encode& encode, bool keepsBytes) {
    try {
        const std::string encoded = encode(decode(bytes));
        if (keepsBytes) CORVANE_REQUIRE(bytes.starts_with(encoded), "a message does not come back");
        CORVANE_REQUIRE(encode(decode(encoded)) == encoded, "a message decodes as another one");
    } catch (const FormatError& error) {
        CORVANE_REQUIRE(*error.what(), "an error says nothing");
    }
}

void checkMessage(std::string_view bytes) {
    const auto encode = [](const auto& message) { return message ? agent::encode(*message) : std::string(); };
    check(bytes, agent::decodeRequest, encode, true);
    check(bytes, agent::decodeReply, encode, true);
    const auto checkOutcome = [](std::string_view outcome) { check(outcome, decodeOutcome, encodeOutcome, false); };
    const auto encodeSubmission = [](const TransferSubmission& one) { return one.encoded(); };
    checkOutcome(bytes);
    check(bytes, TransferSubmission::decode, encodeSubmission, false);
    try {
        const auto reply = agent::decodeReply(bytes);
        if (const auto* completed = reply ? std::get_if<agent::Completed>(&*reply) : nullptr) {
            checkOutcome(completed->outcome);
        }
    } catch (const FormatError&) {
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0 || size > 64 * 1024) return 0;
    const auto stream = fuzz::textOf(data, size - 1);
    const auto whole = received(stream, 64 * 1024);
    // Not so many pieces that nothing else is tried.
    const std::size_t piece = std::max<std::size_t>({data[size - 1], stream.size() / 64, 1});
    CORVANE_REQUIRE(received(stream, piece) == whole, "the pieces make other messages");
    for (const auto& message : whole) checkMessage(message);
    return 0;
}
