#include "Report.h"

#include "text.h"

#include <corvane/Platform/Date.h>

#include <boost/json.hpp>

#include <algorithm>

namespace inspect {

namespace {

namespace json = boost::json;

// JSON is UTF-8; what is not is escaped as for people.
json::string text(const std::string& given) {
    return json::string(printable(given));
}

json::value dateJSON(const std::optional<corvane::Date>& date) {
    if (!date) return nullptr;
    return corvane::millisecondsSince1970(*date);
}

std::string stateOf(const Document& document, const Directory& directory) {
    const std::string own = document.state(directory.isRecording);
    return own.empty() ? document.task->state(directory.agent.process.has_value()) : own;
}

json::object documentJSON(const Document& document, const Directory& directory) {
    return {{"identifier", text(document.identifier)},
            {"handedOver", dateJSON(document.handedOver)},
            {"events", document.events},
            {"bytes", document.bytes},
            {"runsTried", document.retries},
            {"lastTried", dateJSON(document.retried)},
            {"hasPayload", document.hasPayload},
            {"isWithAgent", document.task.has_value()},
            {"state", text(stateOf(document, directory))}};
}

json::object endpointJSON(const Endpoint& endpoint, const Directory& directory) {
    json::array batches, documents;
    for (const auto& batch : endpoint.batches) {
        batches.push_back(json::object{{"identifier", text(batch.identifier)},
                                       {"events", batch.events},
                                       {"bytes", batch.bytes},
                                       {"sessionID", text(batch.session)}});
    }
    for (const auto& document : endpoint.documents) documents.push_back(documentJSON(document, directory));
    json::object ledger;
    for (const auto& [entry, total] : endpoint.ledger) {
        ledger[printable(entry)] = json::object{{"events", total.events}, {"documents", total.documents}};
    }
    return {{"name", text(endpoint.name)},
            {"batches", std::move(batches)},
            {"documents", std::move(documents)},
            {"ledger", std::move(ledger)},
            {"filesWithoutRow", endpoint.abandonedPayloads}};
}

json::object agentObject(const Directory& directory) {
    json::array tasks;
    for (const auto& task : directory.agent.tasks) {
        tasks.push_back(json::object{{"token", text(task.token)},
                                     {"accepted", dateJSON(task.accepted)},
                                     {"isSpooled", task.isSpooled},
                                     {"isWithdrawn", task.isWithdrawn},
                                     {"outcome", task.outcome ? json::value(text(*task.outcome)) : nullptr},
                                     {"url", text(task.submission.request.url)},
                                     {"body", text(task.submission.bodyPath)}});
    }
    const auto& process = directory.agent.process;
    return {{"process", process ? json::value(*process) : nullptr}, {"tasks", std::move(tasks)}};
}

json::array problemsJSON(const Directory& directory) {
    json::array problems;
    for (const auto& problem : directory.problems) problems.push_back(text(problem));
    return problems;
}

template <class Rows>
std::int64_t eventsOf(const Rows& rows) {
    std::int64_t events = 0;
    for (const auto& row : rows) events += row.events;
    return events;
}

std::string line(const std::string& what, std::int64_t events, const std::string& rows) {
    return "  " + what + std::string(what.size() < 24 ? 24 - what.size() : 1, ' ') +
           counted(static_cast<std::uint64_t>(events), "event") + " in " + rows + "\n";
}

void printLedger(std::ostream& out, const Endpoint& endpoint) {
    const auto count = [](std::size_t rows, const char* what) { return counted(rows, what); };
    out << line("open", eventsOf(endpoint.batches), count(endpoint.batches.size(), "batch row"));
    out << line("stored, to be delivered", eventsOf(endpoint.documents), count(endpoint.documents.size(), "document"));
    for (const auto& [entry, total] : endpoint.ledger) {
        out << line(printable(entry), total.events, counted(static_cast<std::uint64_t>(total.documents), "document"));
    }
    if (endpoint.abandonedPayloads > 0) {
        out << "  " << counted(static_cast<std::uint64_t>(endpoint.abandonedPayloads), "payload file")
            << " without a row\n";
    }
}

}  // namespace

void printStatus(std::ostream& out, const Directory& directory, const Style& style) {
    if (!directory.isRecording) out << style.alarming("Recording is off.") << "\n";
    if (directory.isForgetting) out << style.alarming("Forgetting is not done everywhere.") << "\n";
    if (directory.endpoints.empty()) out << "No endpoint has stored anything here.\n";
    for (const auto& endpoint : directory.endpoints) {
        out << style.strong("Endpoint " + printable(endpoint.name)) << "\n";
        printLedger(out, endpoint);
    }
    const auto& agent = directory.agent;
    out << style.strong("Transfer agent") << "\n  "
        << (agent.process ? "runs, process " + std::to_string(*agent.process) : "does not run") << ", "
        << counted(agent.tasks.size(), "task") << "\n";
    constexpr std::size_t most = 20;
    printDocuments(out, directory, style, most);
}

void printDocuments(std::ostream& out, const Directory& directory, const Style& style, std::size_t most) {
    Table table({{"DOCUMENT"}, {"ENDPOINT"}, {"EVENTS", true}, {"SIZE", true}, {"AGE", true}, {"WHY IT HAS NOT GONE"}});
    std::size_t all = 0;
    for (const auto& endpoint : directory.endpoints) {
        for (const auto& document : endpoint.documents) {
            if (++all > most) continue;
            table.add({printable(document.identifier), printable(endpoint.name), std::to_string(document.events),
                       size(document.bytes), age(document.handedOver), stateOf(document, directory)});
        }
    }
    if (all > 0) out << "\n";
    table.print(out, style);
    if (all > most) out << "and " << all - most << " more: corvane-inspect documents lists all of them\n";
}

void printAgent(std::ostream& out, const Directory& directory, const Style& style) {
    const auto& agent = directory.agent;
    out << (agent.process ? "The agent runs, process " + std::to_string(*agent.process) : "No agent runs") << ".\n";
    Table table({{"TASK"}, {"AGE", true}, {"URL"}, {"STATE"}});
    for (const auto& task : agent.tasks) {
        table.add({task.token, task.accepted ? age(*task.accepted) : "", printable(task.submission.request.url),
                   task.state(agent.process.has_value())});
    }
    table.print(out, style);
}

void printChecks(std::ostream& out, const std::string& name, const Payload& payload, const Style& style) {
    out << style.strong(printable(name)) << "\n  SHA-1      " << payload.digest << "\n";
    for (const auto& check : payload.checks) {
        out << "  " << check.what << std::string(11 - std::min<std::size_t>(11, check.what.size()), ' ')
            << (check.problem ? style.alarming(printable(*check.problem)) : "good") << "\n";
    }
    const bool isSigned = !payload.checks.empty() && payload.checks.front().what == "signature";
    if (!isSigned) out << "  signature  made when it is handed over; the agent has none of it\n";
}

void printProblems(std::ostream& out, const Directory& directory, const Style& style) {
    for (const auto& problem : directory.problems) out << style.alarming("problem: " + printable(problem)) << "\n";
}

std::string statusJSON(const Directory& directory) {
    json::array endpoints;
    for (const auto& endpoint : directory.endpoints) endpoints.push_back(endpointJSON(endpoint, directory));
    return json::serialize(json::object{{"directory", text(directory.path.string())},
                                        {"isRecording", directory.isRecording},
                                        {"isForgetting", directory.isForgetting},
                                        {"endpoints", std::move(endpoints)},
                                        {"agent", agentObject(directory)},
                                        {"problems", problemsJSON(directory)}});
}

std::string agentJSON(const Directory& directory) {
    json::object agent = agentObject(directory);
    agent["problems"] = problemsJSON(directory);
    return json::serialize(agent);
}

std::string checksJSON(const std::string& name, const Payload& payload) {
    json::object checks;
    for (const auto& check : payload.checks) {
        checks[check.what] = check.problem ? json::value(text(*check.problem)) : nullptr;
    }
    return json::serialize(json::object{{"document", text(name)},
                                        {"sha1", payload.digest},
                                        {"isGood", payload.isGood()},
                                        {"problems", std::move(checks)}});
}

}  // namespace inspect
