#pragma once

#include "Directory.h"

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace inspect {

/// What a payload file holds, and whether a collector would take it.
struct Payload {
    std::string body;                 ///< as it is sent
    std::optional<std::string> text;  ///< the document in JSON; nothing when it cannot be decompressed
    std::string digest;               ///< SHA-1 of the body, in hexadecimal digits

    struct Check {
        std::string what;
        std::optional<std::string> problem;
    };
    std::vector<Check> checks;  ///< in the order in which a collector makes them
    [[nodiscard]] bool isGood() const;

    /// @param signature the header that goes with it, where it is known
    /// @param publicKey the file of the key to verify it with
    /// Throws `Problem` when the file cannot be read.
    [[nodiscard]] static Payload read(const std::filesystem::path& file, const std::optional<std::string>& signature,
                                      const std::filesystem::path& publicKey);
};

/// The signature that the agent was handed with a document; nothing when it has none of it.
[[nodiscard]] std::optional<std::string> signatureOf(const Document& document);

}  // namespace inspect
