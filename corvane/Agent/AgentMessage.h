#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

namespace corvane {

/// What the library and the transfer agent say to each other; docs/formats/transfer-protocol.md has the bytes and the
/// order. Values, which are neither renumbered nor changed without a new protocol version; values behind the known
/// ones, and further kinds, may come with any later library or agent. Internal.
namespace agent {

/// The version that both must speak.
constexpr std::int64_t protocolVersion = 2;

/// The library's first message, the same in every version: an agent of another one still has to tell its own.
struct Hello {
    static constexpr std::uint8_t kind = 1;
    std::int64_t version = protocolVersion;
    std::string session;
    std::string owner;
    /// As in `TransferSubmission`; replaces what the agent knows, unless it is empty.
    std::vector<std::string> wakeCommand;
    void visit(auto&& with) { with(version, session, owner, wakeCommand); }
};
/// A submission has been put into the spool.
struct Submit {
    static constexpr std::uint8_t kind = 2;
    static constexpr bool isAnswered = true;
    std::string token;
    void visit(auto&& with) { with(token); }
};
/// Asks for the owner's tasks.
struct List {
    static constexpr std::uint8_t kind = 3;
    static constexpr bool isAnswered = true;
    void visit(auto&&) {}
};
/// The delegate has been told of a completion; the agent may forget the task.
struct Acknowledge {
    static constexpr std::uint8_t kind = 4;
    static constexpr bool isAnswered = true;
    std::string token;
    void visit(auto&& with) { with(token); }
};
/// Changes a task's description.
struct Describe {
    static constexpr std::uint8_t kind = 5;
    std::string token;
    std::string description;
    void visit(auto&& with) { with(token, description); }
};
/// Asks to be told when nothing more waits for the library.
struct Flush {
    static constexpr std::uint8_t kind = 6;
    void visit(auto&&) {}
};
/// Asks for a sign of life.
struct Ping {
    static constexpr std::uint8_t kind = 7;
    static constexpr bool isAnswered = true;
    void visit(auto&&) {}
};
/// Tasks have been taken back or cancelled: their marks are there. Answered with a pong.
struct Look {
    static constexpr std::uint8_t kind = 8;
    static constexpr bool isAnswered = true;
    void visit(auto&&) {}
};
/// Drops every task, of every owner, whose body lay beneath a directory and is gone.
struct Discard {
    static constexpr std::uint8_t kind = 9;
    static constexpr bool isAnswered = true;
    std::string directory;
    void visit(auto&& with) { with(directory); }
};

/// The agent's first message.
struct Welcome {
    static constexpr std::uint8_t kind = 65;
    std::int64_t version = protocolVersion;
    void visit(auto&& with) { with(version); }
};
/// The task is in the journal, and the agent's affair from now on.
struct Accepted {
    static constexpr std::uint8_t kind = 66;
    static constexpr bool isAnswer = true;
    std::string token;
    void visit(auto&& with) { with(token); }
};
/// The task was not taken, and is not in the journal.
struct Refused {
    static constexpr std::uint8_t kind = 67;
    static constexpr bool isAnswer = true;
    std::string token;
    std::string reason;
    void visit(auto&& with) { with(token, reason); }
};
/// One of the owner's tasks, in the order in which they were accepted.
struct Known {
    static constexpr std::uint8_t kind = 68;
    std::string token;
    std::optional<std::string> description;
    void visit(auto&& with) { with(token, description); }
};
/// Every task was named.
struct Listed {
    static constexpr std::uint8_t kind = 69;
    static constexpr bool isAnswer = true;
    void visit(auto&&) {}
};
/// So much of a task's body has gone out.
struct Progress {
    static constexpr std::uint8_t kind = 70;
    std::string token;
    std::int64_t total = 0;
    std::int64_t expected = 0;
    void visit(auto&& with) { with(token, total, expected); }
};
/// A task is over; said again to the next connection unless it is acknowledged.
struct Completed {
    static constexpr std::uint8_t kind = 71;
    std::string token;
    std::optional<std::string> description;
    std::string outcome;  ///< its bytes, see `decodeOutcome`
    void visit(auto&& with) { with(token, description, outcome); }
};
/// Nothing waits for the library any more.
struct Flushed {
    static constexpr std::uint8_t kind = 72;
    void visit(auto&&) {}
};
struct Pong {
    static constexpr std::uint8_t kind = 73;
    static constexpr bool isAnswer = true;
    void visit(auto&&) {}
};
/// An acknowledged task has left the journal.
struct Forgotten {
    static constexpr std::uint8_t kind = 74;
    static constexpr bool isAnswer = true;
    std::string token;
    void visit(auto&& with) { with(token); }
};

/// A task that this connection has not reported was acknowledged by another one of its owner, taken back by the process
/// that made it, cancelled or discarded, and is forgotten.
struct Elsewhere {
    static constexpr std::uint8_t kind = 75;
    std::string token;
    std::optional<std::string> description;
    std::string outcome;  ///< its bytes, see `decodeOutcome`; empty when it was not over
    void visit(auto&& with) { with(token, description, outcome); }
};
/// Uploads of the owner to a server are held up, or go on.
struct Trouble {
    static constexpr std::uint8_t kind = 76;
    std::string server;
    bool lasts = true;
    std::string reason;  ///< in words; nothing when it is over
    void visit(auto&& with) { with(server, lasts, reason); }
};
/// The agent does not know such a request.
struct Unsupported {
    static constexpr std::uint8_t kind = 77;
    static constexpr bool isAnswer = true;
    std::int64_t request = 0;
    void visit(auto&& with) { with(request); }
};
/// So many tasks were dropped; nothing of them is sent any more, and none is in the journal.
struct Discarded {
    static constexpr std::uint8_t kind = 78;
    static constexpr bool isAnswer = true;
    std::int64_t dropped = 0;
    void visit(auto&& with) { with(dropped); }
};

using Request = std::variant<Hello, Submit, List, Acknowledge, Describe, Flush, Ping, Look, Discard>;
using Reply = std::variant<Welcome, Accepted, Refused, Known, Listed, Progress, Completed, Flushed, Pong, Forgotten,
                           Elsewhere, Trouble, Unsupported, Discarded>;

/// The longest message there may be, without its length: an answer's head of 256 KiB fits.
constexpr std::size_t longestMessage = std::size_t{512} * 1024;

/// Whether the agent answers a request at once, so that its answer can be waited for. The one to a flush may take as
/// long as a transfer.
[[nodiscard]] bool isAnswered(const Request& request);
/// Whether a reply is the answer to a request, and does not come by itself.
[[nodiscard]] bool isAnswer(const Reply& reply);

/// The bytes of a message, without its length.
[[nodiscard]] std::string encode(Request message);
[[nodiscard]] std::string encode(Reply message);
/// Nothing for a message of a kind that is not known here. Throw `FormatError` for one that is broken.
[[nodiscard]] std::optional<Request> decodeRequest(std::string_view bytes);
[[nodiscard]] std::optional<Reply> decodeReply(std::string_view bytes);

}  // namespace agent
}  // namespace corvane
