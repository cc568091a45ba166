// What the agent hears from its clients, and tells them.
#include <corvane/Agent/Daemon/Agent.h>
#include <corvane/Platform/Error.h>

#include <algorithm>
#include <set>
#include <type_traits>

namespace corvane::transferd {

namespace {

// Completions that a client may leave unacknowledged, and bytes that it may leave unread, before it gets more.
constexpr std::size_t mostTold = 32;
constexpr std::size_t mostUnreadForMore = std::size_t{64} * 1024;
}  // namespace

// --- Clients. --------------------------------------------------------------------------------------------------------

void Agent::request(Client& client, const agent::Request& request) {
    const auto* hello = std::get_if<agent::Hello>(&request);
    if ((hello != nullptr) == (client.owner != nullptr))
        throw InvalidArgument("a greeting is expected once, and first");
    if (hello) return greet(client, *hello);
    std::visit(
        [&](const auto& one) {
            using One = std::remove_cvref_t<decltype(one)>;
            if constexpr (std::is_same_v<One, agent::Submit>) {
                submit(client, one.token);
            } else if constexpr (std::is_same_v<One, agent::List>) {
                list(client);
            } else if constexpr (std::is_same_v<One, agent::Acknowledge>) {
                acknowledge(client, one.token);
            } else if constexpr (std::is_same_v<One, agent::Describe>) {
                describe(client, one);
            } else if constexpr (std::is_same_v<One, agent::Flush>) {
                client.isFlushing = true;
            } else if constexpr (std::is_same_v<One, agent::Ping>) {
                client.send(agent::Pong{});
            }
        },
        request);
}

// One that speaks another version learns which this one is, and goes.
void Agent::greet(Client& client, const agent::Hello& hello) {
    TransferSubmission::checkNames(hello.session, hello.owner, hello.wakeCommand);
    client.send(agent::Welcome{});
    if (hello.version != agent::protocolVersion) {
        client.isLeaving = true;
        return;
    }
    client.owner = &book_.owner(hello.session, hello.owner);
    client.owner->isWoken = false;
    book_.setWakeCommand(*client.owner, hello.wakeCommand, milliseconds());
    tellOfTroubles(client);
}

void Agent::submit(Client& client, const std::string& token) {
    if (!TransferSubmission::isToken(token)) throw InvalidArgument("not a token");
    try {
        const auto number = import(token);
        if (book_.task(number).owner != client.owner) throw InvalidArgument("the task is another owner's");
        book_.task(number).submitter = client.id;
        client.send(agent::Accepted{token});
    } catch (const std::exception& error) {
        client.send(agent::Refused{token, error.what()});
    }
}

void Agent::list(Client& client) {
    importSpool();  // what another host of this owner has left there is under way, too
    std::set<std::int64_t> numbers = client.owner->open;
    for (const auto& [number, told] : client.owner->over) numbers.insert(number);
    for (const auto number : numbers) client.send(agent::Known{book_.task(number).token, book_.description(number)});
    client.send(agent::Listed{});
}

void Agent::acknowledge(Client& client, const std::string& token) {
    const auto number = book_.find(token);
    if (number && book_.task(*number).owner == client.owner) {
        if (!client.owner->over.contains(*number)) throw InvalidArgument("the task is not over");
        forget(*number, &client);
    }
    client.send(agent::Forgotten{token});
}

void Agent::describe(const Client& client, const agent::Describe& change) {
    const auto number = book_.find(change.token);
    if (change.description.size() > TransferSubmission::longestDescription) return;
    if (number && book_.task(*number).owner == client.owner) book_.describe(*number, change.description);
}

// What it was told and has not acknowledged is for the next one. Its last submission may still be in the spool.
void Agent::left(Client& client) {
    spoolChanged_ = true;
    ownersChanged_ = true;
    if (!client.owner) return;
    for (const auto number : client.told) {
        if (const auto found = client.owner->over.find(number); found != client.owner->over.end()) found->second = 0;
    }
}

// --- Completions. ----------------------------------------------------------------------------------------------------

void Agent::reportProgress() {
    for (const auto& progress : queue_.takeProgress()) {
        if (!book_.contains(progress.number)) continue;
        const auto& task = book_.task(progress.number);
        Client* client = addressee(*task.owner, progress.number);
        if (client && client->socket.unsent() < mostUnreadForMore) {
            client->send(agent::Progress{task.token, progress.total, progress.expected});
        }
    }
}

void Agent::deliver() {
    for (auto& [key, owner] : book_.owners()) {
        if (!owner.over.empty() && hasClient(owner)) deliver(owner);
    }
}

void Agent::deliver(Owner& owner) {
    for (auto& [number, told] : owner.over) {
        if (told == 0) deliver(owner, number);
    }
}

void Agent::deliver(Owner& owner, std::int64_t number) {
    Client* client = addressee(owner, number);
    if (!client || client->told.size() >= mostTold || client->socket.unsent() >= mostUnreadForMore) return;
    try {
        client->send(agent::Completed{book_.task(number).token, book_.description(number), book_.outcome(number)});
    } catch (const InvalidArgument&) {  // the journal cannot be read: it is tried again when something happens
        return;
    }
    client->told.insert(number);
    owner.over[number] = client->id;
}

// The host that submitted a task hears of it while it is there, and then the first of the same owner.
ClientList::Client* Agent::addressee(const Owner& owner, std::int64_t number) {
    if (Client* submitter = clients_.find(book_.task(number).submitter)) return submitter;
    const auto found = std::find_if(clients_.all().begin(), clients_.all().end(),
                                    [&](const Client& client) { return client.owner == &owner; });
    return found == clients_.all().end() ? nullptr : &*found;
}

void Agent::answerFlushes() {
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

void Agent::troubleChanged(const UploadQueue::Trouble& trouble, const std::vector<std::int64_t>& uploads) {
    if (trouble.lasts) {
        std::set<Owner*> owners;
        for (const auto number : uploads) owners.insert(book_.task(number).owner);
        for (Owner* owner : owners) tell(*owner, trouble);
        return;
    }
    for (auto& client : clients_.all()) {
        if (client.troubles.erase(trouble.id) > 0) client.send(agent::Trouble{trouble.server, false, {}});
    }
}

void Agent::tell(Owner& owner, const UploadQueue::Trouble& trouble) {
    for (auto& client : clients_.all()) {
        if (client.owner != &owner || !client.troubles.insert(trouble.id).second) continue;
        client.send(agent::Trouble{trouble.server, true, trouble.reason});
    }
}

void Agent::tellOfTroubles(Client& client) {
    queue_.visitTroubles([&](const UploadQueue::Trouble& trouble, const std::vector<std::int64_t>& uploads) {
        const bool isTheirs = std::any_of(uploads.begin(), uploads.end(), [&](std::int64_t number) {
            return book_.task(number).owner == client.owner;
        });
        if (isTheirs) tell(*client.owner, trouble);
    });
}

}  // namespace corvane::transferd
