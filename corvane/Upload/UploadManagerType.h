#pragma once

#include <functional>
#include <memory>
#include <string_view>

namespace corvane {

class SerialQueue;
struct UploadRequest;

/// What became of a document that was taken over: whether its upload outlives a kill of the process.
enum class UploadTaken {
    recorded,   ///< its row is written: whoever keeps its contents elsewhere may let go of them
    underWay,   ///< its row could not be written, and only this attempt is made: its contents must stay where they are
                ///< kept
    forgotten,  ///< neither: what is in it was recorded before it was all to be forgotten
};

/// Takes documents for upload and sees to it that each reaches the collector, is refused by it, or is given up after
/// too many attempts, over restarts of the process too.
///
/// Owned by the batching processor, which calls everything here on the access queue, one call at a time.
class UploadManagerType {
  public:
    virtual ~UploadManagerType() = default;

    /// Gets ready for uploads, and the first time sends again what earlier runs left unfinished. Failures are logged.
    virtual void open() = 0;
    /// Lets go of the database until it is needed again. Uploads that are running go on. Failures are logged.
    virtual void close() = 0;
    /// The queue on which the results of uploads arrive. Called before the first upload.
    virtual void registerAccessQueue(std::shared_ptr<SerialQueue> queue) = 0;
    /// Takes a document over: when the call returns its payload is on disk and its upload has been started. Throws when
    /// the document cannot be encoded, compressed or written; it is then not taken over.
    virtual UploadTaken upload(const UploadRequest& request) = 0;
    /// Lets go of all uploads, which were recorded before everything was to be forgotten: cancels those that are under
    /// way, and sends none again. Their rows and payloads are removed with everybody's. Does nothing by default.
    virtual void forget() {}
    /// Reads the ledger of what is on disk again. Throws what the database failed with. Does nothing by default.
    virtual void readLedger() {}
    /// Offers a background wake-up: see `UploadServiceType::shouldResume`.
    virtual bool shouldResume(std::string_view identifier, std::function<void()> completion) = 0;
};

}  // namespace corvane
