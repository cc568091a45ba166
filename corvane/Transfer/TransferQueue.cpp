#include <corvane/Transfer/TransferQueue.h>

#include <corvane/Transfer/HTTPURL.h>

#include <utility>

namespace corvane {

void TransferQueue::start(Ticket ticket, HTTPTransfer transfer) {
    Waiting arrived{ticket, std::move(transfer)};
    try {
        const std::string host = arrived.transfer.pool + ' ' + HTTPURL::parse(arrived.transfer.request.url).server();
        hosts_[host].waiting.push_back(std::move(arrived));
    } catch (...) {
        TransferScheduler::reportFailure(arrived.transfer);
    }
}

void TransferQueue::cancel(const std::set<Ticket>& tickets) {
    for (auto& [name, host] : hosts_) {
        std::erase_if(host.waiting, [&](const Waiting& one) {
            const bool isMeant = tickets.contains(one.ticket);
            if (isMeant) TransferScheduler::reportCancelled(one.transfer);
            return isMeant;
        });
    }
    scheduler_.cancel(tickets);
}

void TransferQueue::perform() {
    startWaiting();
    scheduler_.perform();
    startWaiting();
}

void TransferQueue::startWaiting() {
    for (auto host = hosts_.begin(); host != hosts_.end();) {
        startWaiting(host->second);
        const bool isEmpty = host->second.running.empty() && host->second.waiting.empty();
        host = isEmpty ? hosts_.erase(host) : std::next(host);
    }
}

// A place is taken before its transfer starts: what there is no memory for stays in line.
void TransferQueue::startWaiting(Host& host) {
    std::erase_if(host.running, [&](Ticket one) { return !scheduler_.isRunning(one); });
    while (!host.waiting.empty()) {
        Waiting& next = host.waiting.front();
        if (static_cast<int>(host.running.size()) >= next.transfer.limits.transfersPerHost) break;
        host.running.push_back(next.ticket);
        if (!scheduler_.start(next.ticket, std::move(next.transfer))) host.running.pop_back();
        host.waiting.pop_front();
    }
}

}  // namespace corvane
