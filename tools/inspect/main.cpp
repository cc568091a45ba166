#include "Directory.h"
#include "Payload.h"
#include "Report.h"
#include "StoredDatabase.h"
#include "Table.h"
#include "examples/support/CommandLine.h"
#include "send.h"
#include "tail.h"
#include "text.h"

#include <corvane/Signing/FileSigningService.h>

#include <curl/curl.h>

#include <csignal>
#include <exception>
#include <functional>
#include <iostream>
#include <limits>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

using namespace inspect;

namespace {

constexpr int good = 0, hasProblems = 1, wrongUsage = 2, outputFailed = 3;

constexpr std::string_view usage = R"(usage: corvane-inspect [COMMAND] [OPTION...] DIRECTORY [ARGUMENT...]

Looks into a documents directory of Corvane's, beside the program that uses it, and changes nothing there.

  status DIRECTORY            what is stored, what became of the rest, what the transfer agent has (without a
                              command, too)
  documents DIRECTORY         every stored document, and why it has not gone
  show DIRECTORY ID           a stored document as it will be sent
  verify DIRECTORY [ID...]    whether a collector would take these documents, or all
  agent DIRECTORY             the transfer agent, and what it was handed
  tail DIRECTORY              what happens, line by line, until Ctrl-C
  send DIRECTORY ID URL       sends a document there now; it stays stored, and its host sends it, too

ID is a document's identifier, or a beginning of one that no other has.

  --format text|json          json: one object for programs, but for show (the document itself), tail and send
  --color auto|always|never   auto: on a terminal, unless NO_COLOR is set
  --public-key FILE           to verify signatures with; otherwise the directory's
  --help, --version

Exit status: 0 when all is well, 1 for problems, 2 for a command line that makes no sense, 3 when the output fails.
)";

struct Request {
    Directory directory;
    std::vector<std::string> arguments;
    bool wantsJSON;
    Style style;
    std::optional<std::string> publicKey;

    [[nodiscard]] std::filesystem::path key() const {
        return publicKey ? std::filesystem::path(*publicKey)
                         : directory.path / corvane::FileSigningService::publicKeyFileName;
    }
};

int endWith(const Directory& directory, bool isGood = true) {
    return isGood && directory.problems.empty() ? good : hasProblems;
}

int status(const Request& request) {
    if (request.wantsJSON) {
        std::cout << statusJSON(request.directory) << "\n";
    } else {
        printStatus(std::cout, request.directory, request.style);
        printProblems(std::cout, request.directory, request.style);
    }
    return endWith(request.directory);
}

int documents(const Request& request) {
    if (request.wantsJSON) return status(request);
    printDocuments(std::cout, request.directory, request.style, std::numeric_limits<std::size_t>::max());
    printProblems(std::cout, request.directory, request.style);
    return endWith(request.directory);
}

int agent(const Request& request) {
    if (request.wantsJSON) {
        std::cout << agentJSON(request.directory) << "\n";
    } else {
        printAgent(std::cout, request.directory, request.style);
        printProblems(std::cout, request.directory, request.style);
    }
    return endWith(request.directory);
}

Payload payloadOf(const Request& request, const Document& document) {
    return Payload::read(document.payload, signatureOf(document), request.key());
}

int show(const Request& request) {
    const auto payload = payloadOf(request, request.directory.document(request.arguments.at(0)));
    for (const auto& check : payload.checks) {
        if (check.what == "gzip" && check.problem) throw Problem("the payload cannot be read: " + *check.problem);
    }
    std::cout << (request.wantsJSON ? payload.text.value() : indented(payload.text.value())) << "\n";
    return good;
}

int verify(const Request& request) {
    std::vector<const Document*> chosen;
    for (const auto& identifier : request.arguments) chosen.push_back(&request.directory.document(identifier));
    if (request.arguments.empty()) {
        for (const auto& endpoint : request.directory.endpoints) {
            for (const auto& document : endpoint.documents) chosen.push_back(&document);
        }
    }
    bool isGood = request.directory.problems.empty();
    for (const auto* document : chosen) {
        try {
            const auto payload = payloadOf(request, *document);
            isGood = isGood && payload.isGood();
            if (request.wantsJSON) {
                std::cout << checksJSON(document->identifier, payload) << "\n";
            } else {
                printChecks(std::cout, document->identifier, payload, request.style);
            }
        } catch (const Problem& problem) {  // one that has gone meanwhile, too
            isGood = false;
            std::cerr << "corvane-inspect: " << printable(problem.what()) << "\n";
        }
    }
    if (!request.wantsJSON) std::cout << counted(chosen.size(), "document") << (isGood ? ", all good\n" : "\n");
    printProblems(std::cerr, request.directory, request.style);
    return endWith(request.directory, isGood);
}

int sendOne(const Request& request) {
    bool isAccepted = false;
    const auto& document = request.directory.document(request.arguments.at(0));
    std::cout << send(request.directory, document, request.arguments.at(1), isAccepted) << "\n"
              << "The document stays stored, and its host sends it, too.\n";
    return isAccepted ? good : hasProblems;
}

struct Command {
    std::function<int(const Request&)> run;
    std::size_t least, most;  // arguments behind the directory
};

const std::map<std::string, Command, std::less<>>& commands() {
    constexpr auto any = std::numeric_limits<std::size_t>::max();
    static const std::map<std::string, Command, std::less<>> all{
        {"status", {status, 0, 0}},   {"documents", {documents, 0, 0}}, {"show", {show, 1, 1}},
        {"verify", {verify, 0, any}}, {"agent", {agent, 0, 0}},         {"send", {sendOne, 2, 2}},
        {"tail", {{}, 0, 0}}};
    return all;
}

int run(int argc, char** argv) {
    if (argc == 2 && std::string_view(argv[1]) == "--version") {
        std::cout << "corvane-inspect " << CORVANE_VERSION << "\n";
        return good;
    }
    const examples::CommandLine line(argc, argv, {"--format", "--color", "--public-key"});
    if (line.wantsHelp()) {
        std::cout << usage;
        return good;
    }
    auto operands = line.operands();
    std::string name = "status";
    if (!operands.empty() && commands().contains(operands.front())) {
        name = operands.front();
        operands.erase(operands.begin());
    }
    const Command& command = commands().at(name);
    if (operands.empty()) throw examples::UsageError("a documents directory is missing; see --help");
    const std::filesystem::path path = operands.front();
    operands.erase(operands.begin());
    if (operands.size() < command.least || operands.size() > command.most) {
        throw examples::UsageError(name + " takes other arguments; see --help");
    }
    const std::string format = line.value("--format").value_or("text");
    if (format != "text" && format != "json") throw examples::UsageError("--format takes text or json");
    const Style style = Style::of(line.value("--color").value_or("auto"));
    if (name == "tail") {
        tail(std::cout, path);
        return outputFailed;
    }
    return command.run(
        {Directory::read(path), std::move(operands), format == "json", style, line.value("--public-key")});
}

}  // namespace

int main(int argc, char** argv) {
    // A reader that goes away is seen by the output.
    std::signal(SIGPIPE, SIG_IGN);
    int result = hasProblems;
    try {
        result = run(argc, argv);
    } catch (const examples::UsageError& error) {
        std::cerr << "corvane-inspect: " << printable(error.what()) << "\n";
        result = wrongUsage;
    } catch (const std::invalid_argument& error) {
        std::cerr << "corvane-inspect: " << printable(error.what()) << "\n";
        result = wrongUsage;
    } catch (const std::exception& error) {
        std::cerr << "corvane-inspect: " << printable(error.what()) << "\n";
    }
    return std::cout.flush() ? result : outputFailed;
}
