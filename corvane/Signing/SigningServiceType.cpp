#include <corvane/Signing/SigningServiceType.h>

#include <corvane/Signing/FileSigningService.h>

#include <mutex>
#include <utility>

namespace corvane {

namespace {

struct SharedService {
    std::mutex mutex;
    std::shared_ptr<SigningServiceType> service;

    static SharedService& instance() {
        static auto& instance = *new SharedService;
        return instance;
    }
};

}  // namespace

void SigningServiceType::setShared(std::shared_ptr<SigningServiceType> service) {
    auto& shared = SharedService::instance();
    const std::lock_guard lock(shared.mutex);
    std::swap(shared.service, service);  // the old one goes after the lock
}

std::shared_ptr<SigningServiceType> SigningServiceType::shared() {
    auto& shared = SharedService::instance();
    const std::lock_guard lock(shared.mutex);
    if (!shared.service) shared.service = std::make_shared<FileSigningService>();
    return shared.service;
}

}  // namespace corvane
