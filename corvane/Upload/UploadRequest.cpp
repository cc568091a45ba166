#include <corvane/Upload/UploadRequest.h>

#include <corvane/Platform/Bytes.h>
#include <corvane/Platform/Error.h>

#include <utility>

namespace corvane {

UploadRequest::UploadRequest(Client sender, std::shared_ptr<const ResourceType> document)
    : client(std::move(sender)), resource(std::move(document)) {
    if (holdsControlCharacter(resource->contentType()) || holdsControlCharacter(resource->version())) {
        throw InvalidArgument("the document's content type or version holds a control character");
    }
}

}  // namespace corvane
