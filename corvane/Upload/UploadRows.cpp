#include <corvane/Upload/UploadRows.h>

#include <corvane/Platform/Log.h>
#include <corvane/Platform/RecordingSwitch.h>

#include <map>
#include <utility>

namespace corvane {

namespace {

using Changes = LedgerBook::Changes;

void addTotal(Changes& changes, LedgerEntry entry, const DocumentEntity& document) {
    changes.totals[entry].events += document.events;
    ++changes.totals[entry].documents;
}

void write(const std::map<LedgerEntry, Ledger::Count>& totals, const std::shared_ptr<StoreConnection>& connection) {
    Store<LedgerEntity> ledger(connection);
    for (const auto& [entry, count] : totals) {
        ledger.add({std::string(nameOf(entry)), count.events, count.documents});
    }
}

std::vector<std::string> texts(const std::shared_ptr<StoreConnection>& connection, const char* sql) {
    std::vector<std::string> texts;
    connection->query(sql, [&](StoreStepper& stepper) {
        if (auto text = stepper.optionalText()) texts.push_back(*std::move(text));
    });
    return texts;
}

}  // namespace

UploadRows::UploadRows(std::shared_ptr<DeferredStore<SignedEntity>> deferredStore, std::shared_ptr<LedgerBook> book)
    : deferredStore_(std::move(deferredStore)), book_(std::move(book)) {}

void UploadRows::change(FunctionRef<void(Rows&, Changes&)> operation) {
    deferredStore_->perform([&](Rows& rows) {
        try {
            deferredStore_->transaction([&] {
                Changes changes;
                operation(rows, changes);
                write(book_->write(changes), rows.connection());
            });
            book_->didWrite(true);
        } catch (...) {
            book_->didWrite(false);
            throw;
        }
    });
}

void UploadRows::open() {
    deferredStore_->perform([](Rows& rows) {
        rows.open();
        rows.createTable();
    });
}

void UploadRows::close() {
    deferredStore_->perform([](Rows& rows) { rows.close(); });
}

// What they have removed is not known to have arrived; what they have written is there, with events that are not known.
void UploadRows::reconcile() {
    change([](Rows& rows, Changes& changes) {
        const auto& connection = rows.connection();
        Store<DocumentEntity> documents(connection);
        for (const auto& identifier :
             texts(connection, "SELECT identifier FROM documents EXCEPT SELECT identifier FROM signed_requests;")) {
            for (const auto& gone : documents.takeWhere("identifier", identifier)) {
                addTotal(changes, LedgerEntry::unknown, gone);
            }
        }
        for (const auto& identifier :
             texts(connection, "SELECT identifier FROM signed_requests EXCEPT SELECT identifier FROM documents;")) {
            documents.insert({identifier});
        }
    });
}

bool UploadRows::record(const SignedEntity& entity, const DocumentEntity& document, std::int64_t epoch,
                        const RemoveBackup& removeBackup) {
    bool isRecorded = false;
    change([&](Rows& rows, Changes& changes) {
        isRecorded = RecordingSwitch::epoch() <= epoch;
        if (!isRecorded) return;
        rows.insert(entity);
        Store<DocumentEntity>(rows.connection()).insert(document);
        if (removeBackup) removeBackup(rows.connection());
        changes.waiting = {document.events, 1};
        changes.waitingBytes = document.bytes;
    });
    return isRecorded;
}

UploadRows::Stored UploadRows::stored() {
    try {
        reconcile();
        readLedger();
    } catch (...) {  // books that are behind are no reason not to send
        Log::shared().error("Failed to bring the ledger up to date, error=%{public}@", AnyError::current().what());
    }
    return deferredStore_->perform([](Rows& rows) {
        return Stored{.identifiers = rows.keys(), .isInMemory = rows.connection()->location().isMemory()};
    });
}

std::vector<std::string> UploadRows::identifiers() {
    return deferredStore_->perform([](Rows& rows) { return rows.keys(); });
}

std::optional<SignedEntity> UploadRows::find(const std::string& identifier) {
    auto found = deferredStore_->perform([&](Rows& rows) { return rows.fetchWhere("identifier", identifier); });
    return found.empty() ? std::nullopt : std::optional(std::move(found.front()));
}

std::vector<UploadRows::Oldest> UploadRows::oldest(std::size_t count) {
    std::vector<Oldest> oldest;
    deferredStore_->perform([&](Rows& rows) {
        const std::string sql =
            "SELECT identifier, bytes, createdDate FROM (SELECT identifier, createdDate FROM signed_requests ORDER BY "
            "createdDate LIMIT " +
            std::to_string(count) + ") JOIN documents USING (identifier) ORDER BY createdDate;";
        rows.connection()->query(sql, [&](StoreStepper& stepper) {
            Oldest one{.identifier = stepper.text(), .bytes = stepper.count(), .created = now()};
            one.created = dateFromSeconds(stepper.double_()).value_or(one.created);
            oldest.push_back(std::move(one));
        });
    });
    return oldest;
}

bool UploadRows::countRetry(const UploadResult::Retry& retry, bool isFirstOfRun) {
    bool isThere = false;
    change([&](Rows& rows, Changes& changes) {
        auto found = rows.fetchWhere("identifier", retry.identifier);
        isThere = !found.empty();
        if (!isThere || !retry.isCounted) return;
        if (isFirstOfRun) {
            auto& entity = found.front();
            ++entity.retries;
            entity.retryAfterDate = retry.after;
            rows.insert(entity);
        }
        for (const auto& document : Store<DocumentEntity>(rows.connection()).fetchWhere("identifier", retry.identifier))
            addTotal(changes, LedgerEntry::sentAgain, document);
    });
    return isThere;
}

void UploadRows::end(const Ending& ending) {
    endAll({ending});
}

std::optional<AnyError> UploadRows::end(const std::vector<Ending>& endings) noexcept {
    try {
        if (!endings.empty()) endAll(endings);
        return std::nullopt;
    } catch (...) {
        return AnyError::current();
    }
}

void UploadRows::endAll(const std::vector<Ending>& endings) {
    change([&](Rows& rows, Changes& changes) {
        Store<DocumentEntity> documents(rows.connection());
        for (const auto& [identifier, entry] : endings) {
            rows.deleteWhere("identifier", identifier);
            for (const auto& document : documents.takeWhere("identifier", identifier)) {
                addTotal(changes, entry, document);
                changes.waiting.events -= document.events;
                --changes.waiting.documents;
                changes.waitingBytes -= document.bytes;
            }
        }
    });
}

void UploadRows::writeLedger() {
    if (book_->isWritten()) return;
    change([](Rows&, Changes&) {});
}

void UploadRows::readLedger() {
    deferredStore_->perform([this](Rows& rows) {
        Changes stored;
        for (const auto& total : Store<LedgerEntity>(rows.connection()).fetchAll()) {
            const auto entry = ledgerEntryOf(total.entry);
            if (entry) stored.totals[*entry] = {total.events, total.documents};
        }
        const auto sums = Store<DocumentEntity>(rows.connection()).sums();
        stored.waiting = {sums.at(1), sums.at(0)};
        stored.waitingBytes = sums.at(2);
        book_->setStored(stored);
    });
}

}  // namespace corvane
