#include <corvane/Upload/UploadRows.h>

#include <utility>

namespace corvane {

UploadRows::UploadRows(std::shared_ptr<DeferredStore<SignedEntity>> deferredStore)
    : deferredStore_(std::move(deferredStore)) {}

void UploadRows::open() {
    deferredStore_->perform([](Rows& rows) {
        rows.open();
        rows.createTable();
    });
}

void UploadRows::close() {
    deferredStore_->perform([](Rows& rows) { rows.close(); });
}

void UploadRows::record(const SignedEntity& entity, const RemoveBackup& removeBackup) {
    deferredStore_->perform([&](Rows& rows) {
        if (!removeBackup) return rows.insert(entity);
        rows.transaction([&] {
            rows.insert(entity);
            removeBackup(rows.connection());
        });
    });
}

UploadRows::Stored UploadRows::stored() {
    return deferredStore_->perform([](Rows& rows) {
        return Stored{.identifiers = rows.keys(), .isInMemory = rows.connection()->location().isMemory()};
    });
}

std::optional<SignedEntity> UploadRows::find(const std::string& identifier) {
    auto found = deferredStore_->perform([&](Rows& rows) { return rows.fetchWhere("identifier", identifier); });
    return found.empty() ? std::nullopt : std::optional(std::move(found.front()));
}

bool UploadRows::countRetry(const UploadResult::Retry& retry) {
    // One turn on the store's queue: the count must not be read before and written after another's.
    return deferredStore_->perform([&](Rows& rows) {
        auto found = rows.fetchWhere("identifier", retry.identifier);
        if (found.empty()) return false;
        if (!retry.isCounted) return true;
        auto& entity = found.front();
        ++entity.retries;
        entity.retryAfterDate = retry.after;
        rows.insert(entity);
        return true;
    });
}

void UploadRows::remove(const std::string& identifier) {
    deferredStore_->perform([&](Rows& rows) { rows.deleteWhere("identifier", identifier); });
}

std::optional<AnyError> UploadRows::remove(const std::vector<std::string>& identifiers) noexcept {
    try {
        if (identifiers.size() == 1) {
            remove(identifiers.front());
        } else if (!identifiers.empty()) {
            deferredStore_->perform([&](Rows& rows) {
                rows.transaction([&] {
                    for (const auto& identifier : identifiers) rows.deleteWhere("identifier", identifier);
                });
            });
        }
        return std::nullopt;
    } catch (...) {
        return AnyError::current();
    }
}

}  // namespace corvane
