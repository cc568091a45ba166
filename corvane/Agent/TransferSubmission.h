#pragma once

#include <corvane/Transfer/TransferProxy.h>
#include <corvane/Transfer/TransferRequest.h>
#include <corvane/Transfer/TransferSessionConfiguration.h>

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace corvane {

/// One upload as it is handed over to the transfer agent: everything that it needs to know when the host has gone. A
/// value. Its bytes are a file in the agent's directory and a column of its journal; see
/// docs/formats/transfer-journal.md. Internal.
struct TransferSubmission {
    /// The task's name for good; see `newToken`.
    std::string token;
    /// The session's identifier and owner key.
    std::string session;
    std::string owner;
    std::optional<std::string> description;
    TransferRequest request;
    /// The body; absolute.
    std::string bodyPath;
    TransferLimits limits;
    /// How long the agent may wait for a server that cannot be reached.
    std::chrono::milliseconds patience{};
    /// The program, with its arguments, that is run when events wait for a host that is not running; may be empty.
    std::vector<std::string> wakeCommand;
    /// As in `TransferSessionConfiguration`, an absolute path; empty for the system's certificates.
    std::string trustedCertificates = {};
    /// Of the environment of the process that handed the upload over.
    TransferProxy proxy = {};
    /// Whatever else a later library has to say, by name. What an agent does not know it leaves alone.
    std::vector<std::pair<std::string, std::string>> extras = {};

    /// In `extras`: nobody wants to know how much of the body has gone out.
    static constexpr std::pair<std::string_view, std::string_view> withoutProgress = {"progress", "none"};
    [[nodiscard]] bool wantsProgress() const noexcept;

    [[nodiscard]] std::string encoded() const;
    /// Reads what version 1 wrote, too. Throws `FormatError` for bytes that are no submission, and for values that
    /// cannot be right.
    [[nodiscard]] static TransferSubmission decode(std::string_view bytes);

    /// A name that nobody has had: the time in 16 hexadecimal digits, so that names sort by age, and 66 random bits.
    [[nodiscard]] static std::string newToken();
    /// Whether `text` has the form of a token, which is safe as a file's name.
    [[nodiscard]] static bool isToken(std::string_view text) noexcept;

    /// More than any request needs; longer submissions are not taken.
    static constexpr std::size_t longest = std::size_t{256} * 1024;

    // What the agent keeps of every owner, beyond its tasks, has a bound.
    static constexpr std::size_t longestName = std::size_t{8} * 1024;
    static constexpr std::size_t longestCommand = std::size_t{32} * 1024;
    static constexpr std::size_t longestDescription = std::size_t{64} * 1024;
    /// Throws `FormatError`, and says which, when one is beyond its bound.
    static void checkNames(std::string_view session, std::string_view owner,
                           const std::vector<std::string>& wakeCommand);
};

}  // namespace corvane
