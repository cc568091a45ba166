#pragma once

#include "Agent.h"

#include <corvane/Platform/Date.h>

#include <cstdint>
#include <filesystem>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace inspect {

/// A row of events that are not handed over yet.
struct Batch {
    std::string identifier = {};
    std::int64_t events = 0;
    std::int64_t bytes = 0;
    std::string session = {};  ///< its identifier
};

/// A document that is stored.
struct Document {
    std::string identifier = {};
    std::string endpoint = {};
    corvane::Date handedOver = {};
    std::int64_t events = 0;
    std::int64_t bytes = 0;                     ///< of the payload file; as its row says where there is none
    std::int64_t retries = 0;                   ///< runs in which an attempt failed
    std::optional<corvane::Date> retried = {};  ///< when the last of those ended
    std::string contentType = {}, userAgent = {};
    std::filesystem::path payload = {};
    bool hasPayload = false;
    std::optional<AgentTask> task = {};  ///< the agent's

    /// Why it has not gone, for people.
    [[nodiscard]] std::string state(bool isRecording) const;
};

struct Endpoint {
    std::string name = {};
    std::vector<Batch> batches = {};
    std::vector<Document> documents = {};  ///< the oldest first
    struct Total {
        std::int64_t events = 0, documents = 0;
    };
    std::map<std::string, Total> ledger = {};  ///< as the table has it
    std::int64_t abandonedPayloads = 0;  ///< files without a row: a start removes or takes up what is the library's
};

/// Everything in a documents directory, as far as it can be read.
struct Directory {
    std::filesystem::path path = {};
    bool isRecording = true;
    bool isForgetting = false;  ///< `forget` was called and is not done everywhere
    std::vector<Endpoint> endpoints = {};
    Agent agent = {};
    std::vector<std::string> problems = {};  ///< what could not be read

    /// Throws `Problem` when there is no such directory; everything else is among the problems.
    [[nodiscard]] static Directory read(const std::filesystem::path& path);
    /// By its identifier, or the beginning of one that no other has. Throws `Problem`.
    [[nodiscard]] const Document& document(const std::string& identifier) const;
};

}  // namespace inspect
