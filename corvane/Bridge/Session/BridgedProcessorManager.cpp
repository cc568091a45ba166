#include <corvane/Bridge/Session/BridgedProcessorManager.h>

#include <corvane/Bridge/Models/Refusal.h>
#include <corvane/Bridge/Session/BridgedEventProcessor.h>

#include <utility>

namespace corvane {

BridgedProcessorManager::BridgedProcessorManager(std::shared_ptr<ProcessorManager> processorManager)
    : processorManager_(bridge::present(std::move(processorManager), "the processor manager")) {}
BridgedProcessorManager::~BridgedProcessorManager() = default;

bool BridgedProcessorManager::addEventProcessor(const std::shared_ptr<BridgedEventProcessorType>& eventProcessor,
                                                BridgedError* error) {
    return bridge::attempt("addEventProcessor", error,
                           [&] { processorManager_->add(std::make_shared<BridgedEventProcessor>(eventProcessor)); });
}

void BridgedProcessorManager::removeEventProcessor(const std::shared_ptr<BridgedEventProcessorType>& eventProcessor) {
    if (eventProcessor) processorManager_->remove(std::make_shared<BridgedEventProcessor>(eventProcessor));
}

void BridgedProcessorManager::resumeBackgroundProcessingForIdentifier(std::string identifier,
                                                                      std::function<void()> completion) {
    processorManager_->resumeBackgroundProcessing(std::move(identifier), std::move(completion));
}

}  // namespace corvane
