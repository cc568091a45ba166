// The destructors and defaults of the folder's interfaces, here so that each has its table of functions in one place.
#include <corvane/Upload/EndpointType.h>
#include <corvane/Upload/ResourceType.h>
#include <corvane/Upload/SignerType.h>
#include <corvane/Upload/UploadDropboxType.h>
#include <corvane/Upload/UploadManagerType.h>
#include <corvane/Upload/UploadServiceDelegate.h>
#include <corvane/Upload/UploadServiceType.h>

namespace corvane {

EndpointType::~EndpointType() = default;
std::filesystem::path EndpointType::trustedCertificates() const {
    return {};
}
std::function<HTTPHeaders()> EndpointType::headers() const {
    return {};
}
ResourceType::~ResourceType() = default;
SignerType::~SignerType() = default;
UploadDropboxType::~UploadDropboxType() = default;
UploadManagerType::~UploadManagerType() = default;
UploadServiceDelegate::~UploadServiceDelegate() = default;
void UploadServiceDelegate::uploadEndedElsewhere(const UploadResult&) {}
UploadServiceType::~UploadServiceType() = default;

std::vector<std::string> UploadDropboxType::abandonedPayloads(const std::set<std::string>&) {
    return {};
}
void UploadServiceType::inFlight(std::function<void(const std::set<std::string>&)>) {}

}  // namespace corvane
