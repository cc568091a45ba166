#include <corvane/Upload/EndpointUse.h>

#include <corvane/Platform/Log.h>
#include <corvane/Platform/Mutex.h>
#include <corvane/Upload/UploadService.h>

#include <set>

namespace corvane {

namespace {

struct Uses {
    Mutex mutex;
    std::multiset<std::string> keys CORVANE_GUARDED_BY(mutex);
};

Uses& uses() {
    static auto& instance = *new Uses;  // never destroyed: processors may go while the process exits
    return instance;
}

}  // namespace

EndpointUse::EndpointUse(const Endpoint& endpoint) : key_(UploadService::ownerKey(endpoint)) {
    bool isShared = false;
    {
        const Lock lock(uses().mutex);
        isShared = uses().keys.contains(key_);
        uses().keys.insert(key_);
    }
    if (isShared) {
        Log::shared().error(
            "Endpoint is used by two processors of this process, and its events may be sent twice, name=%{public}@",
            endpoint.name());
    }
}

EndpointUse::~EndpointUse() {
    const Lock lock(uses().mutex);
    if (const auto found = uses().keys.find(key_); found != uses().keys.end()) uses().keys.erase(found);
}

}  // namespace corvane
