#pragma once

#include <corvane/Export.h>
#include <corvane/Models/Client.h>
#include <corvane/Upload/ResourceType.h>

#include <memory>

namespace corvane {

/// A document to upload and the application that sends it. A value; the document is shared.
struct CORVANE_EXPORT UploadRequest {
    /// Throws `InvalidArgument` when the document's type or version holds a control character: both go into a header.
    UploadRequest(Client sender, std::shared_ptr<const ResourceType> document);

    Client client;
    std::shared_ptr<const ResourceType> resource;  ///< never null
};

}  // namespace corvane
