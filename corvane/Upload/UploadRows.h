#pragma once

#include <corvane/Platform/Error.h>
#include <corvane/Store/DeferredStore.h>
#include <corvane/Upload/SignedEntity.h>
#include <corvane/Upload/UploadManagerType.h>
#include <corvane/Upload/UploadResult.h>

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace corvane {

/// The database's part in an endpoint's uploads: one row for each that is not over. Callable from any thread but the
/// store's queue, for which every call waits. Internal.
class UploadRows {
  public:
    using RemoveBackup = std::function<void(const std::shared_ptr<StoreConnection>&)>;

    struct Stored {
        std::vector<std::string> identifiers;  // in the order in which the rows were written last
        bool isInMemory = false;               // then they say nothing of what is on disk
    };

    explicit UploadRows(std::shared_ptr<DeferredStore<SignedEntity>> deferredStore);

    /// Opens the database and creates the table. Throws `StoreError` and `DeferredStoreError`, as all of these do.
    void open();
    void close();

    /// Writes a new upload's row and has the backup of its contents removed, both or neither.
    void record(const SignedEntity& entity, const RemoveBackup& removeBackup);
    [[nodiscard]] Stored stored();
    [[nodiscard]] std::optional<SignedEntity> find(const std::string& identifier);
    /// Counts a retry in the upload's row. Returns false when there is no row.
    bool countRetry(const UploadResult::Retry& retry);
    void remove(const std::string& identifier);
    /// Removes all of them or none, in which case it returns why.
    [[nodiscard]] std::optional<AnyError> remove(const std::vector<std::string>& identifiers) noexcept;

  private:
    using Rows = Store<SignedEntity>;

    const std::shared_ptr<DeferredStore<SignedEntity>> deferredStore_;
};

}  // namespace corvane
