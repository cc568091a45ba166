// The destructors of the folder's interfaces, here so that each has its table of functions in one place.
#include <corvane/Upload/EndpointType.h>
#include <corvane/Upload/ResourceType.h>
#include <corvane/Upload/SignerType.h>
#include <corvane/Upload/UploadDropboxType.h>
#include <corvane/Upload/UploadManagerType.h>
#include <corvane/Upload/UploadServiceDelegate.h>
#include <corvane/Upload/UploadServiceType.h>

namespace corvane {

EndpointType::~EndpointType() = default;
ResourceType::~ResourceType() = default;
SignerType::~SignerType() = default;
UploadDropboxType::~UploadDropboxType() = default;
UploadManagerType::~UploadManagerType() = default;
UploadServiceDelegate::~UploadServiceDelegate() = default;
void UploadServiceDelegate::uploadEndedElsewhere(const UploadResult&) {}
UploadServiceType::~UploadServiceType() = default;

}  // namespace corvane
