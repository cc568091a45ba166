#include <corvane/Agent/Host/BackgroundTransferSession.h>

#include <corvane/Agent/Host/AgentProgram.h>
#include <corvane/Agent/Host/BackgroundTransferCore.h>

#include <utility>

namespace corvane {

bool BackgroundTransferSession::isAvailable() {
    return !AgentProgram::find().empty();
}

TransferSession::Factory BackgroundTransferSession::factory(TransferAgentOptions options) {
    return [options = std::move(options)](const TransferSessionConfiguration& configuration,
                                          std::weak_ptr<TransferSessionDelegate> delegate,
                                          std::shared_ptr<SerialQueue> queue) {
        return std::make_shared<BackgroundTransferSession>(configuration, std::move(delegate), std::move(queue),
                                                           options);
    };
}

BackgroundTransferSession::BackgroundTransferSession(const TransferSessionConfiguration& configuration,
                                                     std::weak_ptr<TransferSessionDelegate> delegate,
                                                     std::shared_ptr<SerialQueue> queue,
                                                     const TransferAgentOptions& options)
    : core_(std::make_shared<BackgroundTransferCore>(configuration, std::move(delegate), std::move(queue), options)) {
    core_->open();
}

BackgroundTransferSession::~BackgroundTransferSession() {
    core_->close();
}

std::optional<std::string> BackgroundTransferSession::description() const {
    return core_->description.get();
}

void BackgroundTransferSession::setDescription(std::string description) {
    core_->description.set(std::move(description));
}

std::shared_ptr<TransferTask> BackgroundTransferSession::uploadTask(TransferRequest request,
                                                                    std::filesystem::path file) {
    return core_->add(std::move(request), std::move(file));
}

void BackgroundTransferSession::tasks(Listing listing) {
    core_->tasks(std::move(listing));
}

void BackgroundTransferSession::deliverPendingEvents() {
    core_->deliverPendingEvents();
}

}  // namespace corvane
