#include <corvane/Upload/StorageBounds.h>

#include <corvane/Platform/Date.h>
#include <corvane/Platform/Log.h>

#include <algorithm>
#include <filesystem>
#include <utility>

namespace corvane {

namespace {

using Reason = DeliveryUpdate::Reason;

constexpr std::size_t portion = 32;  // documents that are given up at a time

}  // namespace

/// The payloads that were looked at so far.
struct StorageBounds::Check {
    std::filesystem::directory_iterator next;
    std::int64_t counted = 0;  // before it began
    std::int64_t found = 0;
};

StorageBounds::StorageBounds(StorageLimits limits, std::shared_ptr<SerialQueue> queue,
                             std::shared_ptr<UploadServiceType> service, std::shared_ptr<UploadRows> rows,
                             std::shared_ptr<UploadDropboxType> dropbox, std::shared_ptr<DeliveryLedger> ledger,
                             std::shared_ptr<LedgerBook> book)
    : limits_(limits),
      queue_(std::move(queue)),
      service_(std::move(service)),
      rows_(std::move(rows)),
      dropbox_(std::move(dropbox)),
      ledger_(std::move(ledger)),
      book_(std::move(book)) {}

void StorageBounds::begin() {
    queue_->assertCurrent("StorageBounds::begin");
    const auto directory = dropbox_->payloadDirectory();
    std::error_code missing;
    std::filesystem::directory_iterator first(directory, missing);
    if (directory.empty() || missing) return keep();
    checkPortion(std::make_shared<Check>(Check{std::move(first), book_->waitingBytes(), 0}));
}

// What comes and goes meanwhile may be counted or not: a document or two.
void StorageBounds::checkPortion(std::shared_ptr<Check> check) {
    constexpr int files = 1000;
    std::error_code failed;
    for (int i = 0; i < files && check->next != std::filesystem::directory_iterator(); ++i) {
        std::error_code gone;
        const auto size = check->next->file_size(gone);
        if (!gone) check->found += static_cast<std::int64_t>(size);
        check->next.increment(failed);
    }
    if (check->next == std::filesystem::directory_iterator()) {
        // Rows whose payloads have gone are dropped before long, with what they count.
        if (!failed) book_->setUncountedBytes(std::max<std::int64_t>(0, check->found - check->counted));
        return keep();
    }
    queue_->async([weak = weak_from_this(), check = std::move(check)]() mutable {
        const auto self = weak.lock();
        if (!self) return;
        self->queue_->assertCurrent("StorageBounds::checkPortion");
        self->checkPortion(std::move(check));
    });
}

void StorageBounds::keep(std::int64_t added) {
    queue_->assertCurrent("StorageBounds::keep");
    addedSince_ += added;
    try {
        auto found = excess();
        if (found.documents.empty()) return;
        withdraw(std::move(found.documents));
        if (!found.isComplete) keepLater();
    } catch (...) {
        Log::shared().error("Failed to give up what is stored beyond the bounds, error=%{public}@",
                            AnyError::current().what());
    }
}

void StorageBounds::keepLater() {
    queue_->async([weak = weak_from_this()] {
        const auto self = weak.lock();
        if (!self) return;
        self->keep();
    });
}

StorageBounds::Excess StorageBounds::excess() {
    Excess excess;
    const bool isMetAnew = !isMet_ && book_->bytesOnDisk() > limits_.maximumBytes;
    if (isMetAnew || addedSince_ > limits_.maximumBytes / 16) {
        rows_->readLedger();
        addedSince_ = 0;
    }
    auto bytes = book_->bytesOnDisk() - bytesBeingWithdrawn();
    bool isGettingOn = true;  // since the oldest were looked up: what was found here comes up again, as do damaged rows
    while (!oldest_.empty() || std::exchange(isGettingOn, false)) {
        const auto* oldest = oldestIfNeeded(bytes);
        if (!oldest) break;
        if (excess.documents.size() == portion) {
            excess.isComplete = false;
            break;
        }
        const bool isTooOld = this->isTooOld(*oldest);
        if (!isTooOld && bytes <= limits_.maximumBytes) break;
        const auto document = *oldest;
        oldest_.pop_front();
        if (excess.documents.contains(document.identifier) || isWithdrawn(document.identifier)) continue;
        if (!isStored(document.identifier)) continue;  // gone meanwhile
        isGettingOn = true;
        if (bytes > limits_.maximumBytes) logBound(bytes);
        const auto size = sizeOf(document);
        bytes -= size;
        excess.documents.emplace(document.identifier,
                                 Withdrawn{isTooOld ? Reason::tooOld : Reason::noRoom, size, size - document.bytes});
    }
    return excess;
}

// A row that cannot be read takes room, too, and goes in its turn; a name that no statement can hold is nobody's.
bool StorageBounds::isStored(const std::string& identifier) {
    try {
        return rows_->find(identifier).has_value();
    } catch (const StoreStepperError&) {
        return true;
    } catch (const InvalidArgument&) {
        return false;
    }
}

// Looked up many at a time: at the bound every new document asks for the oldest.
const UploadRows::Oldest* StorageBounds::oldestIfNeeded(std::int64_t bytes) {
    constexpr std::size_t atOnce = 256;
    if (bytes <= limits_.maximumBytes && !limits_.maximumAge) return nullptr;
    if (oldest_.empty()) {
        for (auto& document : rows_->oldest(atOnce + countBeingWithdrawn())) {
            if (!isWithdrawn(document.identifier)) oldest_.push_back(std::move(document));
        }
    }
    return oldest_.empty() ? nullptr : &oldest_.front();
}

bool StorageBounds::isTooOld(const UploadRows::Oldest& document) const {
    return limits_.maximumAge && millisecondsBetween(document.created, now()) > limits_.maximumAge->count();
}

std::size_t StorageBounds::countBeingWithdrawn() {
    const Lock lock(mutex_);
    return withdrawn_.size();
}

std::int64_t StorageBounds::bytesBeingWithdrawn() {
    const Lock lock(mutex_);
    std::int64_t bytes = 0;
    for (const auto& [identifier, withdrawn] : withdrawn_) bytes += withdrawn.size;
    return bytes;
}

void StorageBounds::logBound(std::int64_t bytes) {
    if (isMet_.exchange(true)) return;
    Log::shared().error(
        "More is stored than is allowed, and the oldest documents are given up, bytes=%ld, maximumBytesOnDisk=%ld",
        bytes, limits_.maximumBytes);
}

std::int64_t StorageBounds::sizeOf(const UploadRows::Oldest& document) {
    std::error_code failed;
    const auto file = dropbox_->existingFile(document.identifier);
    const auto size = file ? std::filesystem::file_size(*file, failed) : 0;
    return file && !failed ? static_cast<std::int64_t>(size) : document.bytes;
}

void StorageBounds::withdraw(Documents documents) {
    std::set<std::string> identifiers;
    for (const auto& [identifier, withdrawn] : documents) identifiers.insert(identifier);
    {
        const Lock lock(mutex_);
        withdrawn_.merge(documents);
    }
    service_->cancel(std::move(identifiers), [weak = weak_from_this()](const std::set<std::string>& notUnderWay) {
        const auto self = weak.lock();
        if (!self) return;
        for (const auto& identifier : notUnderWay) {
            if (const auto reason = self->takeReason(identifier)) self->giveUp(identifier, *reason);
        }
    });
}

std::optional<Reason> StorageBounds::takeReason(const std::string& identifier) {
    Documents::node_type taken;
    {
        const Lock lock(mutex_);
        taken = withdrawn_.extract(identifier);
    }
    if (!taken) return std::nullopt;
    book_->addUncountedBytes(-taken.mapped().uncounted);
    return taken.mapped().reason;
}

bool StorageBounds::isWithdrawn(const std::string& identifier) {
    const Lock lock(mutex_);
    return withdrawn_.contains(identifier);
}

void StorageBounds::end(const std::string& identifier) {
    static_cast<void>(takeReason(identifier));
    noteRoom();
}

// Not at the bound itself, where every document would meet it anew.
void StorageBounds::noteRoom() {
    const auto room = limits_.maximumBytes - limits_.maximumBytes / 10;
    if (isMet_ && book_->bytesOnDisk() <= room) isMet_ = false;
}

void StorageBounds::giveUp(const std::string& identifier, Reason reason) {
    Log::shared().default_("Stored document was given up, identifier=%{public}@, reason=%{public}@", identifier,
                           reason == Reason::tooOld ? "age" : "size");
    try {
        rows_->end({identifier, reason == Reason::tooOld ? LedgerEntry::givenUpAge : LedgerEntry::givenUpSize});
        if (dropbox_->existingFile(identifier)) dropbox_->finish(identifier, std::nullopt);
    } catch (...) {
        Log::shared().error("Failed to give up a stored document, identifier=%{public}@, error=%{public}@", identifier,
                            AnyError::current().what());
    }
    ledger_->settle(identifier, DeliveryLedger::Outcome::givenUp, {.reason = reason});
    noteRoom();
}

}  // namespace corvane
