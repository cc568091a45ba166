#include "Directory.h"

#include "StoredDatabase.h"
#include "text.h"

#include <corvane/Agent/AgentDirectory.h>
#include <corvane/Models/JSON.h>
#include <corvane/Platform/PrivateFile.h>

#include <algorithm>
#include <set>
#include <sstream>
#include <system_error>
#include <utility>

namespace inspect {

namespace {

namespace fs = std::filesystem;

constexpr std::string_view prefix = "com.veskar.corvane.", databaseSuffix = ".db", dropboxSuffix = ".upload-dropbox";

void readBatches(StoredDatabase& database, Endpoint& endpoint, std::vector<std::string>& problems) {
    if (!database.hasTable("upload_batches")) return;
    const auto unreadable = database.forEach(
        "SELECT identifier, length(events), json_array_length(CAST(events AS TEXT), '$.events'), session FROM "
        "upload_batches",
        [&](corvane::StoreStepper& row) {
            Batch batch{.identifier = row.text(), .bytes = row.count()};
            batch.events = row.count();
            batch.session = corvane::JSON(row.bytes())["sessionID"].string().value_or("");
            endpoint.batches.push_back(std::move(batch));
        });
    if (unreadable > 0) problems.push_back(endpoint.name + ": " + counted(unreadable, "batch row") + " cannot be read");
}

void readDocuments(StoredDatabase& database, const fs::path& dropbox, Endpoint& endpoint,
                   std::vector<std::string>& problems) {
    if (!database.hasTable("signed_requests")) return;
    const bool hasCounts = database.hasTable("documents");
    const auto unreadable = database.forEach(
        std::string("SELECT r.identifier, r.createdDate, r.retries, coalesce(r.retryAfterDate, 0), r.contentType, "
                    "r.userAgent, ") +
            (hasCounts ? "coalesce(d.events, 0), coalesce(d.bytes, 0) FROM signed_requests r LEFT JOIN documents d ON "
                         "d.identifier = r.identifier"
                       : "0, 0 FROM signed_requests r") +
            " ORDER BY r.createdDate",
        [&](corvane::StoreStepper& row) {
            Document document{.identifier = row.text(), .endpoint = endpoint.name};
            document.handedOver = corvane::dateFromSeconds(row.double_()).value_or(corvane::Date());
            document.retries = row.count();
            const double retried = row.double_();
            if (document.retries > 0) document.retried = corvane::dateFromSeconds(retried);
            document.contentType = row.text();
            document.userAgent = row.text();
            document.events = row.count();
            document.bytes = row.count();
            document.payload = dropbox / document.identifier;
            std::error_code error;
            const auto size = fs::file_size(document.payload, error);
            document.hasPayload = !error && size > 0;
            if (!error) document.bytes = static_cast<std::int64_t>(size);
            endpoint.documents.push_back(std::move(document));
        });
    if (unreadable > 0) {
        problems.push_back(endpoint.name + ": " + counted(unreadable, "document row") + " cannot be read");
    }
}

void readLedger(StoredDatabase& database, Endpoint& endpoint) {
    if (!database.hasTable("ledger")) return;
    database.forEach("SELECT entry, events, documents FROM ledger", [&](corvane::StoreStepper& row) {
        const std::string entry = row.text();
        endpoint.ledger[entry].events = row.count();
        endpoint.ledger[entry].documents = row.count();
    });
}

void countAbandoned(const fs::path& dropbox, Endpoint& endpoint) {
    std::set<std::string> stored;
    for (const auto& document : endpoint.documents) stored.insert(document.identifier);
    std::error_code error;
    for (fs::directory_iterator entry(dropbox, error), end; !error && entry != end; entry.increment(error)) {
        endpoint.abandonedPayloads += !stored.contains(entry->path().filename());
    }
}

Endpoint readEndpoint(const fs::path& file, std::string name, std::vector<std::string>& problems) {
    Endpoint endpoint{.name = std::move(name)};
    const fs::path dropbox = file.parent_path() / (std::string(prefix) + endpoint.name + std::string(dropboxSuffix));
    const auto attempt = [&](const auto& read) {
        try {
            read();
        } catch (const Problem& problem) {
            if (problems.empty() || problems.back() != problem.what()) problems.emplace_back(problem.what());
        }
    };
    attempt([&] {
        StoredDatabase database(file);
        // What is damaged in one table leaves the others to be read.
        attempt([&] { readBatches(database, endpoint, problems); });
        attempt([&] { readDocuments(database, dropbox, endpoint, problems); });
        attempt([&] { readLedger(database, endpoint); });
        countAbandoned(dropbox, endpoint);
    });
    return endpoint;
}

// "on", "off", or "on <epoch> <finished epoch>".
void readRecording(Directory& directory) {
    const fs::path file = directory.path / (std::string(prefix) + "recording");
    std::error_code error;
    if (!fs::exists(file, error)) return;
    std::istringstream in;
    try {
        in.str(corvane::readWholeFile(file));
    } catch (const std::exception& problem) {
        directory.problems.emplace_back(problem.what());
    }
    std::string word;
    std::int64_t epoch = 0, finished = 0;
    in >> word;
    directory.isRecording = word == "on";
    if (in >> epoch >> finished) directory.isForgetting = finished < epoch;
}

}  // namespace

std::string Document::state(bool isRecording) const {
    if (!hasPayload) return "its payload is missing or empty: given up when its host next starts a session";
    if (task) return "";
    std::string state = "waits for a host to hand it over";
    if (retried) {
        state = "was tried in " + counted(static_cast<std::uint64_t>(retries), "run") + ", the last time " +
                age(*retried) + " ago: sent again by the host's next run, or after its retryDelay";
    }
    return isRecording ? state : state + "; recording is off";
}

Directory Directory::read(const fs::path& path) {
    Directory directory{.path = path};
    std::error_code error;
    std::vector<fs::path> files;
    for (fs::directory_iterator entry(path, error), end; !error && entry != end; entry.increment(error)) {
        files.push_back(entry->path());
    }
    if (error) throw Problem(path.string() + " cannot be read: " + error.message());
    std::sort(files.begin(), files.end());
    for (const auto& file : files) {
        std::string name = file.filename();
        if (name.size() <= prefix.size() + databaseSuffix.size() || !name.starts_with(prefix) ||
            !name.ends_with(databaseSuffix)) {
            continue;
        }
        name = name.substr(prefix.size(), name.size() - prefix.size() - databaseSuffix.size());
        directory.endpoints.push_back(readEndpoint(file, std::move(name), directory.problems));
    }
    readRecording(directory);
    directory.agent = Agent::read(path / corvane::AgentDirectory::usualName, directory.problems);

    // Whose task it is shows in the path of its body.
    std::map<std::string, const AgentTask*> tasks;
    for (const auto& task : directory.agent.tasks) {
        if (!task.isWithdrawn) tasks[fs::weakly_canonical(task.submission.bodyPath, error).string()] = &task;
    }
    for (auto& endpoint : directory.endpoints) {
        for (auto& document : endpoint.documents) {
            const auto found = tasks.find(fs::weakly_canonical(document.payload, error).string());
            if (found != tasks.end()) document.task = *found->second;
        }
    }
    return directory;
}

const Document& Directory::document(const std::string& identifier) const {
    const Document* found = nullptr;
    for (const auto& endpoint : endpoints) {
        for (const auto& document : endpoint.documents) {
            if (document.identifier == identifier) return document;
            if (identifier.empty() || !document.identifier.starts_with(identifier)) continue;
            if (found) throw Problem("several documents begin with " + printable(identifier));
            found = &document;
        }
    }
    if (!found) throw Problem("no document " + printable(identifier) + " is stored here");
    return *found;
}

}  // namespace inspect
