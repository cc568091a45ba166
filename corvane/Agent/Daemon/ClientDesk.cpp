#include <corvane/Agent/Daemon/ClientDesk.h>

#include <corvane/Agent/Daemon/JournalError.h>
#include <corvane/Agent/Daemon/WallClock.h>
#include <corvane/Agent/FormatError.h>
#include <corvane/Agent/OutcomeCodec.h>

#include <algorithm>
#include <exception>
#include <set>
#include <variant>

namespace corvane::transferd {

namespace {
// Completions that a client may leave unacknowledged, and bytes that it may leave unread, before it gets more.
constexpr std::size_t mostTold = 32;
constexpr std::size_t mostUnreadForMore = std::size_t{64} * 1024;

TaskBook::Owner& ownerOf(const ClientList::Client& client) {
    if (!client.owner) throw FormatError("a greeting is expected once, and first");
    return *client.owner;
}
}  // namespace

bool ClientDesk::hasClient(const Owner& owner) const {
    return std::any_of(clients_.all().begin(), clients_.all().end(),
                       [&](const Client& client) { return client.owner == &owner; });
}

void ClientDesk::dropOwners() {
    if (!std::exchange(ownersChanged_, false)) return;
    book_.dropOwners([this](const Owner& owner) { return hasClient(owner); });
}

// --- Requests. -------------------------------------------------------------------------------------------------------

void ClientDesk::request(Client& client, const agent::Request& request) {
    const bool isGreeting = std::holds_alternative<agent::Hello>(request);
    if (isGreeting == (client.owner != nullptr)) throw FormatError("a greeting is expected once, and first");
    std::visit([&](const auto& one) { take(client, one); }, request);
}

void ClientDesk::take(Client& client, const agent::Hello& hello) {
    TransferSubmission::checkNames(hello.session, hello.owner, hello.wakeCommand);
    client.send(agent::Welcome{});
    if (hello.version != agent::protocolVersion) {
        client.isLeaving = true;
        return;
    }
    client.owner = &book_.owner(hello.session, hello.owner);
    client.owner->isWoken = false;
    book_.setWakeCommand(*client.owner, hello.wakeCommand, wallClock());
    queue_.visitTroubles([&](const UploadQueue::Trouble& trouble, const std::vector<std::int64_t>& uploads) {
        const bool isTheirs = std::any_of(uploads.begin(), uploads.end(), [&](std::int64_t number) {
            return book_.task(number).owner == client.owner;
        });
        if (isTheirs) tell(*client.owner, trouble);
    });
}

void ClientDesk::take(Client& client, const agent::Submit& request) {
    const auto& token = request.token;
    if (!TransferSubmission::isToken(token)) throw FormatError("not a token");
    try {
        const auto number = intake_.accept(token);
        if (book_.task(number).owner != client.owner) throw FormatError("the task is another owner's");
        book_.task(number).submitter = client.id;
        client.send(agent::Accepted{token});
    } catch (const std::exception& error) {
        client.send(agent::Refused{token, error.what()});
    }
}

void ClientDesk::take(Client& client, const agent::List&) {
    intake_.acceptSpooled();  // what another host of this owner has left there is under way, too
    const Owner& owner = ownerOf(client);
    std::set<std::int64_t> numbers = owner.open;
    for (const auto& [number, told] : owner.over) numbers.insert(number);
    for (const auto number : numbers) client.send(agent::Known{book_.task(number).token, book_.description(number)});
    client.send(agent::Listed{});
}

void ClientDesk::take(Client& client, const agent::Acknowledge& request) {
    const Owner& owner = ownerOf(client);
    const auto number = book_.find(request.token);
    if (number && book_.task(*number).owner == &owner) {
        if (!owner.over.contains(*number)) throw FormatError("the task is not over");
        forget(*number, &client);
    }
    client.send(agent::Forgotten{request.token});
}

void ClientDesk::take(Client& client, const agent::Describe& request) {
    const auto number = book_.find(request.token);
    if (request.description.size() > TransferSubmission::longestDescription) return;
    if (number && book_.task(*number).owner == client.owner) book_.describe(*number, request.description);
}

void ClientDesk::take(Client& client, const agent::Flush&) {
    client.isFlushing = true;
}

void ClientDesk::take(Client& client, const agent::Ping&) {
    client.send(agent::Pong{});
}

// The system may have had no watch to give.
void ClientDesk::take(Client& client, const agent::Look&) {
    intake_.noteChange();
    client.send(agent::Pong{});
}

void ClientDesk::take(Client& client, const agent::Discard& request) {
    const std::filesystem::path directory(request.directory);
    if (!directory.is_absolute()) throw FormatError("not an absolute path");
    intake_.acceptSpooled();
    const auto numbers = book_.withBodiesGoneBeneath(directory);
    for (const auto number : numbers) drop(number);
    client.discarded.push_back({std::ssize(numbers)});
}

void ClientDesk::drop(std::int64_t number) {
    queue_.remove(number);
    forget(number, nullptr);
}

void ClientDesk::forget(std::int64_t number, const Client* reporter) {
    const Owner* owner = book_.task(number).owner;
    for (auto& client : clients_.all()) {
        client.told.erase(number);
        if (&client != reporter && client.owner == owner) client.send(elsewhere(number));
    }
    book_.forget(number);
    ownersChanged_ = true;
}

agent::Elsewhere ClientDesk::elsewhere(std::int64_t number) {
    agent::Elsewhere message{book_.task(number).token, std::nullopt, {}};
    const bool isOver = book_.task(number).owner->over.contains(number);
    try {
        message.description = book_.description(number);
        if (isOver) message.outcome = book_.outcome(number);
    } catch (const JournalError&) {
        if (isOver) message.outcome = encodeOutcome(unreadableOutcome());
    }
    return message;
}

// What it was told and has not acknowledged is for the next one. Its last submission may still be in the spool.
void ClientDesk::left(Client& client) {
    intake_.noteChange();
    ownersChanged_ = true;
    if (!client.owner) return;
    for (const auto number : client.told) {
        if (const auto found = client.owner->over.find(number); found != client.owner->over.end()) found->second = 0;
    }
}

// --- Completions. ----------------------------------------------------------------------------------------------------

void ClientDesk::reportProgress() {
    for (const auto& progress : queue_.takeProgress()) {
        if (!book_.contains(progress.number)) continue;
        const auto& task = book_.task(progress.number);
        if (!task.wantsProgress) continue;
        Client* client = addressee(*task.owner, progress.number);
        if (client && client->socket.unsent() < mostUnreadForMore) {
            client->send(agent::Progress{task.token, progress.total, progress.expected});
        }
    }
}

void ClientDesk::deliver() {
    reportProgress();
    for (auto& [key, owner] : book_.owners()) {
        if (!owner.over.empty() && hasClient(owner)) deliver(owner);
    }
    answerFlushes();
    answerDiscards();
}

void ClientDesk::answerDiscards() {
    if (!book_.isSettled()) return;
    for (auto& client : clients_.all()) {
        for (const auto& answer : std::exchange(client.discarded, {})) client.send(answer);
    }
}

void ClientDesk::deliver(Owner& owner) {
    for (auto& [number, told] : owner.over) {
        if (told == 0) deliver(owner, number);
    }
}

void ClientDesk::deliver(Owner& owner, std::int64_t number) {
    Client* client = addressee(owner, number);
    if (!client || client->told.size() >= mostTold || client->socket.unsent() >= mostUnreadForMore) return;
    try {
        client->send(agent::Completed{book_.task(number).token, book_.description(number), book_.outcome(number)});
    } catch (const JournalError&) {  // the journal cannot be read: it is tried again when something happens
        return;
    }
    client->told.insert(number);
    owner.over[number] = client->id;
}

ClientList::Client* ClientDesk::addressee(const Owner& owner, std::int64_t number) {
    if (Client* submitter = clients_.find(book_.task(number).submitter)) return submitter;
    const auto found = std::find_if(clients_.all().begin(), clients_.all().end(),
                                    [&](const Client& client) { return client.owner == &owner; });
    return found == clients_.all().end() ? nullptr : &*found;
}

void ClientDesk::answerFlushes() {
    for (auto& client : clients_.all()) {
        if (!client.isFlushing || !client.told.empty()) continue;
        const auto& over = client.owner->over;
        const bool isWaitedFor = std::any_of(over.begin(), over.end(), [&](const auto& one) {
            return one.second == 0 && addressee(*client.owner, one.first) == &client;
        });
        if (isWaitedFor) continue;
        client.isFlushing = false;
        client.send(agent::Flushed{});
    }
}

// --- Troubles. -------------------------------------------------------------------------------------------------------

void ClientDesk::tell(const UploadQueue::Trouble& trouble, const std::vector<std::int64_t>& uploads) {
    if (trouble.lasts) {
        std::set<const Owner*> owners;
        for (const auto number : uploads) owners.insert(book_.task(number).owner);
        for (const Owner* owner : owners) tell(*owner, trouble);
        return;
    }
    for (auto& client : clients_.all()) {
        if (client.troubles.erase(trouble.id) > 0) client.send(agent::Trouble{trouble.server, false, {}});
    }
}

void ClientDesk::tell(const Owner& owner, const UploadQueue::Trouble& trouble) {
    for (auto& client : clients_.all()) {
        if (client.owner != &owner || !client.troubles.insert(trouble.id).second) continue;
        client.send(agent::Trouble{trouble.server, true, trouble.reason});
    }
}

}  // namespace corvane::transferd
