#include <corvane/Processing/Forgetting.h>

#include <corvane/Agent/Host/TransferDiscard.h>
#include <corvane/Platform/Date.h>
#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/PrivateFile.h>
#include <corvane/Platform/RecordingSwitch.h>
#include <corvane/Platform/UUID.h>
#include <corvane/Processing/UploadBatchEntity.h>
#include <corvane/Store/DeferredStore.h>
#include <corvane/Store/EpochEntity.h>
#include <corvane/Transfer/TransferError.h>
#include <corvane/Upload/SignedEntity.h>
#include <corvane/Upload/UploadDropbox.h>

#include <atomic>
#include <chrono>
#include <filesystem>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <utility>

namespace corvane {

namespace {

namespace fs = std::filesystem;

std::atomic<std::int64_t> epochUnderWay = 0;

struct Swept {
    ForgottenRecords forgotten;
    std::optional<AnyError> error;  // the first one
};

/// What stands between the two in a file's name, if anything does.
std::optional<std::string> between(const fs::path& file, std::string_view opening, std::string_view closing) {
    const std::string name = file.filename().string();
    const bool fits = name.size() > opening.size() + closing.size() && name.compare(0, opening.size(), opening) == 0 &&
                      name.compare(name.size() - closing.size(), closing.size(), closing) == 0;
    if (!fits) return std::nullopt;
    return name.substr(opening.size(), name.size() - opening.size() - closing.size());
}

bool namesEndpoint(const std::string& name) {
    try {
        return DocumentsDirectory::fileNamePart(name) == name;
    } catch (const InvalidArgument&) {
        return false;  // somebody else's file
    }
}

/// The documents that stay; nothing where they cannot be told.
std::optional<std::set<std::string>> storedDocuments(const std::shared_ptr<StoreConnection>& connection) {
    try {
        const auto keys = Store<SignedEntity>(connection).keys();
        return std::set<std::string>(keys.begin(), keys.end());
    } catch (const StoreError&) {
        return std::nullopt;
    }
}

/// Removes the payloads that no row stands for: of a process that was killed before it wrote the row, or in the midst
/// of the payload, or beside a database that is lost. One that is being written has none yet either, but it is younger
/// than the epoch. Where the clock was put back since, its age says little.
void removeOrphans(const fs::path& payloads, const std::optional<std::set<std::string>>& stored, std::int64_t epoch) {
    constexpr std::chrono::seconds granularity(1);  // of the file system's clock
    const auto time = dateFromMilliseconds(epoch).value_or(Date::max());
    if (time > now() && !stored) return;
    const auto begin = time > now() ? now() - std::chrono::hours(1) : time - granularity;
    std::error_code failed;
    for (fs::directory_iterator entry(payloads, failed), end; !failed && entry != end; entry.increment(failed)) {
        const auto name = entry->path().filename().string();
        std::error_code unseen;
        const auto written = std::chrono::file_clock::to_sys(entry->last_write_time(unseen));
        const bool isStored = stored && stored->contains(name);
        const bool isOurs = isUUID(name) || isPartialFile(name);
        if (!unseen && written < begin && isOurs && !isStored) fs::remove(entry->path(), unseen);
    }
}

void removeDebuggingCopies(const fs::path& copies) {
    std::error_code failed;
    for (fs::directory_iterator entry(copies, failed), end; !failed && entry != end; entry.increment(failed)) {
        auto document = between(entry->path(), "", ".request.json");
        if (!document) document = between(entry->path(), "", ".response.json");
        if (document && isUUID(*document)) fs::remove(entry->path(), failed);
    }
    if (failed && failed != std::errc::no_such_file_or_directory) {
        throw SystemError("remove the debugging copies in " + copies.string(), failed.value());
    }
}

/// Forgets what a documents directory holds of before an epoch. What fails is logged, and keeps the rest from nothing.
class Sweep {
  public:
    Sweep(fs::path directory, std::int64_t epoch) : directory_(std::move(directory)), epoch_(epoch) {}

    [[nodiscard]] Swept run() {
        attempt([this] {
            if (fs::absolute(DocumentsDirectory::path()) != directory_) {
                throw InvalidArgument("another documents directory was set meanwhile");
            }
            for (const auto& name : endpoints()) sweep(name);
        });
        return std::move(swept_);
    }

  private:
    template <class Work>
    void attempt(const Work& work) {
        try {
            work();
        } catch (...) {
            auto error = AnyError::current();
            Log::shared().error("Failed to forget what was recorded, error=%{public}@", error.what());
            if (!swept_.error) swept_.error = std::move(error);
        }
    }

    /// Also those that have lost their database.
    [[nodiscard]] std::set<std::string> endpoints() const {
        std::set<std::string> names;
        for (const auto& entry : fs::directory_iterator(directory_)) {
            for (const auto* kind : {".db", ".upload-dropbox", ".upload-dropbox.debugging"}) {
                const auto name = between(entry.path(), "com.veskar.corvane.", kind);
                if (name && namesEndpoint(*name)) names.insert(*name);
            }
        }
        return names;
    }

    void sweep(const std::string& name) {
        const auto files = (directory_ / "com.veskar.corvane.").string() + name;
        std::optional<std::set<std::string>> stored;
        attempt([&] {
            if (!fs::is_regular_file(files + ".db")) return;
            const auto connection = std::make_shared<StoreConnection>(StoreLocation::default_(name));
            attempt([&] { sweepDatabase(connection); });
            stored = storedDocuments(connection);
        });
        attempt([&] {
            if (!fs::is_directory(files + ".upload-dropbox")) return;
            removeOrphans(files + ".upload-dropbox", stored, epoch_);
            syncDirectory(files + ".upload-dropbox");  // what a power cut brought back nobody would look for
        });
        attempt([&] { removeDebuggingCopies(files + ".upload-dropbox.debugging"); });
    }

    void sweepDatabase(const std::shared_ptr<StoreConnection>& connection) {
        connection->transaction([&] {
            forgetBefore(epoch_, connection, Store<SignedEntity>::table());
            forgetBefore(epoch_, connection, Store<UploadBatchEntity>::table());
        });
        for (const auto& known : Store<EpochEntity>(connection).fetchAll()) {
            if (known.epoch < epoch_) continue;
            swept_.forgotten.events += known.forgotten.events;
            swept_.forgotten.documents += known.forgotten.documents;
        }
        // The log of the database still has what the tables have no more; another process that reads keeps it for a
        // while.
        connection->run("PRAGMA wal_checkpoint(TRUNCATE);");
    }

    const fs::path directory_;
    const std::int64_t epoch_;
    Swept swept_;
};

void finish(std::int64_t epoch, Swept swept, const DiscardResult& discarded, const ForgetCompletion& done) {
    if (discarded.status == DiscardResult::Status::failed) {
        Log::shared().error("Failed to stop what the transfer agent sends, error=%{public}@", discarded.problem);
        if (!swept.error)
            swept.error = AnyError(TransferError(TransferError::Code::network,
                                                 "the transfer agent was not stopped: " + discarded.problem));
    }
    try {
        if (!swept.error) RecordingSwitch::finishEpoch(epoch);
    } catch (...) {
        swept.error = AnyError::current();
    }
    epochUnderWay = 0;
    if (done) done(swept.forgotten, swept.error ? &*swept.error : nullptr);
}

}  // namespace

void forgetDirectory(std::int64_t epoch, ForgetCompletion done) {
    epochUnderWay = epoch;
    DeferredStoreCore::queue().async([epoch, directory = fs::absolute(DocumentsDirectory::path()),
                                      done = std::move(done)] {
        const auto swept = Sweep(directory, epoch).run();
        try {
            TransferDiscard::start(directory, [epoch, swept, done](const DiscardResult& result) {
                DeferredStoreCore::queue().async([epoch, swept, done, result] { finish(epoch, swept, result, done); });
            });
        } catch (...) {
            finish(epoch, swept, {.status = DiscardResult::Status::failed, .problem = AnyError::current().what()},
                   done);
        }
    });
}

void finishForgetting() {
    const auto epoch = RecordingSwitch::unfinishedEpoch();
    if (epoch == 0 || epochUnderWay.exchange(epoch) == epoch) return;
    Log::shared().default_("Forgetting what an earlier run was to forget");
    forgetDirectory(epoch, {});
}

}  // namespace corvane
