#pragma once

#include <corvane/Processing/UploadBatches.h>
#include <corvane/Upload/UploadManagerType.h>
#include <corvane/corvane.h>

#include <functional>
#include <memory>
#include <string>
#include <string_view>

namespace corvane::bench {

/// Takes documents and does nothing with them, so that the backup alone is measured.
class NullUploadManager final : public UploadManagerType {
  public:
    void open() override {}
    void close() override {}
    void registerAccessQueue(std::shared_ptr<SerialQueue>) override {}
    UploadTaken upload(const UploadRequest&) override { return UploadTaken::recorded; }
    bool shouldResume(std::string_view, std::function<void()>) override { return false; }
};

/// A batching processor whose full batches go nowhere.
inline std::shared_ptr<UploadBatchEventProcessor> backupOnly(const std::string& name, int batchSize,
                                                             Durability durability = Durability::processKill) {
    const UploadBatchEventOptions options{.batchSize = batchSize, .durability = durability};
    return std::make_shared<UploadBatchEventProcessor>(std::make_shared<UploadBatches>(
        Client{"com.example.bench", "Bench", "1.0", 1}, std::make_shared<NullUploadManager>(),
        std::make_shared<DeferredStore<UploadBatchEntity>>(name, durability), UploadBatchEventConfig(options),
        std::make_shared<DeliveryLedger>()));
}

}  // namespace corvane::bench
