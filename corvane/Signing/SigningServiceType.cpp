#include <corvane/Signing/SigningServiceType.h>

#include <corvane/Platform/Mutex.h>
#include <corvane/Signing/FileSigningService.h>

#include <utility>

namespace corvane {

namespace {

struct SharedService {
    Mutex mutex;
    std::shared_ptr<SigningServiceType> service CORVANE_GUARDED_BY(mutex);

    static SharedService& instance() {
        static auto& instance = *new SharedService;
        return instance;
    }
};

}  // namespace

void SigningServiceType::setShared(std::shared_ptr<SigningServiceType> service) {
    auto& shared = SharedService::instance();
    const Lock lock(shared.mutex);
    std::swap(shared.service, service);  // the old one goes after the lock
}

std::shared_ptr<SigningServiceType> SigningServiceType::shared() {
    auto& shared = SharedService::instance();
    const Lock lock(shared.mutex);
    if (!shared.service) shared.service = std::make_shared<FileSigningService>();
    return shared.service;
}

}  // namespace corvane
