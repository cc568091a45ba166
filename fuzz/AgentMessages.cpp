// What a host and its agent send each other, in whatever pieces it comes: frames, messages, outcomes, submissions.

#include <corvane/Agent/AgentMessage.h>
#include <corvane/Agent/FormatError.h>
#include <corvane/Agent/FrameSocket.h>
#include <corvane/Agent/OutcomeCodec.h>
#include <corvane/Agent/TransferSubmission.h>

#include "fuzz/FuzzTarget.h"

#include <sys/socket.h>
#include <unistd.h>

using namespace corvane;

/// The messages of a stream that comes in pieces, and "" behind them when nothing can be read there.
static std::vector<std::string> received(std::string_view stream, std::size_t piece) {
    static int pair[2] = {-1, -1};  // stays open: whatever was sent has been received
    if (pair[0] < 0) CORVANE_REQUIRE(socketpair(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK, 0, pair) == 0, "no sockets");
    FrameSocket frames{Descriptor(dup(pair[0]))};
    std::vector<std::string> messages;
    for (; !stream.empty(); stream.remove_prefix(std::min(piece, stream.size()))) {
        const auto part = stream.substr(0, piece);
        const bool isSent = write(pair[1], part.data(), part.size()) == static_cast<ssize_t>(part.size());
        CORVANE_REQUIRE(isSent && frames.receive(), "the connection has ended");
        if (!messages.empty() && messages.back().empty()) continue;
        try {
            while (auto message = frames.next()) messages.push_back(*std::move(message));
        } catch (const FormatError&) {
            messages.emplace_back();
        }
    }
    return messages;
}

/// Whatever can be decoded gives its own bytes again, but for those behind them that a later version has added.
template <class Decode, class Encode>
static void check(std::string_view bytes, const Decode& decode, const Encode& encode, bool keepsBytes) {
    try {
        const std::string encoded = encode(decode(bytes));
        CORVANE_REQUIRE(!keepsBytes || bytes.starts_with(encoded), "a message does not come back");
        CORVANE_REQUIRE(encode(decode(encoded)) == encoded, "a message decodes as another one");
    } catch (const FormatError& error) {
        CORVANE_REQUIRE(*error.what(), "an error says nothing");
    }
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0 || size > 64 * 1024) return 0;
    const auto stream = fuzz::textOf(data, size - 1);
    const auto whole = received(stream, 64 * 1024);
    // Not so many pieces that nothing else is tried.
    const std::size_t piece = std::max<std::size_t>({data[size - 1], stream.size() / 64, 1});
    CORVANE_REQUIRE(received(stream, piece) == whole, "the pieces make other messages");
    const auto encode = [](const auto& message) { return message ? agent::encode(*message) : std::string(); };
    for (const std::string_view message : whole) {
        check(message, agent::decodeRequest, encode, true);
        check(message, agent::decodeReply, encode, true);
        check(message, decodeOutcome, encodeOutcome, false);
        check(
            message, TransferSubmission::decode, [](const auto& one) { return one.encoded(); }, false);
    }
    return 0;
}
