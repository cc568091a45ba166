#pragma once

#include <chrono>
#include <cstddef>
#include <filesystem>
#include <optional>
#include <string>

namespace corvane {

/// What a transfer may take. A value.
struct TransferLimits {
    /// Bytes of an answer's body that are read, and dropped; at this many the transfer ends with the answer it has.
    std::size_t responseBody = std::size_t{64} * 1024;
    /// How long no byte may go either way, while connecting too, before the transfer fails.
    std::chrono::milliseconds timeWithoutProgress = std::chrono::seconds(60);
    /// How long a server may take for its answer once it has the whole request, however steadily bytes trickle in: the
    /// transfer then ends with the head of the answer if that has come, and otherwise fails. A request that is still
    /// going out is not hurried.
    std::chrono::milliseconds answer = std::chrono::minutes(5);
    /// Transfers to one host and port at a time; further ones wait their turn, and hold up no other host's.
    int transfersPerHost = 4;
};

/// What a transfer session is opened with. A value.
struct TransferSessionConfiguration {
    /// Names the session; the host is woken for its events under this name.
    std::string identifier;
    /// Tells apart the owners that share one identifier, the same text in every run of the program: callbacks and
    /// listings concern the owner's tasks alone.
    std::string ownerKey = {};
    /// The container that the host shares with its extensions, for sessions outside the process.
    std::optional<std::string> sharedContainerIdentifier = {};
    /// Whether the system may choose when to transfer.
    bool discretionary = false;
    /// Whether the host is to be started again, or woken, for the session's events.
    bool relaunchesForEvents = false;
    TransferLimits limits = {};
    /// The authorities that a server's certificate may come from, in place of the system's: a file in PEM form, or a
    /// directory as OpenSSL's c_rehash makes it. It is read when a connection is made, outside the process too, so it
    /// must stay where it is; a relative path is made absolute when the session is opened. One that cannot be read
    /// fails transfers as `TransferError` blocked. Empty: the system's authorities.
    std::filesystem::path trustedCertificates = {};
};

}  // namespace corvane
