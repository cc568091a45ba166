#pragma once

#include <corvane/Models/Client.h>
#include <corvane/Platform/Durability.h>
#include <corvane/Upload/ResourceType.h>

#include <cstdint>
#include <functional>
#include <memory>

namespace corvane {

class StoreConnection;

/// A document to upload and the application that sends it. A value; the document is shared.
///
/// Whoever keeps the document's contents elsewhere hands along how they are let go of, so that one transaction puts the
/// document's row in and takes them out: a process that is killed, or a disk that fills up, leaves the one or the
/// other.
struct UploadRequest {
    /// Throws `InvalidArgument` when the document's type or version holds a control character: both go into a header.
    UploadRequest(Client sender, std::shared_ptr<const ResourceType> document);

    Client client;
    std::shared_ptr<const ResourceType> resource;  ///< never null
    std::int64_t events = 0;                       ///< in the document
    std::int64_t epoch = 0;                        ///< in which they were recorded: see `RecordingSwitch`
    /// What the payload must survive from the moment at which the backup goes: what the backup survives by then.
    Durability durability = Durability::processKill;
    /// Called at most once, on the queue of the deferred stores, inside the transaction that has written the document's
    /// row on the connection that it is given. Must not throw. May be empty.
    std::function<void(const std::shared_ptr<StoreConnection>&)> removeBackup = {};
};

}  // namespace corvane
