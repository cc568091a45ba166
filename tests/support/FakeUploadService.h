#pragma once

#include <corvane/Platform/SerialQueue.h>
#include <corvane/Upload/PreparedUploadRequest.h>
#include <corvane/Upload/UploadResult.h>
#include <corvane/Upload/UploadServiceDelegate.h>
#include <corvane/Upload/UploadServiceType.h>

#include <set>
#include <string>
#include <utility>
#include <vector>

namespace corvane::test {

/// An upload service that sends nothing: it keeps what it is given, and an upload ends when the test says so, on the
/// test's thread. Not thread-safe.
class FakeUploadService final : public UploadServiceType {
  public:
    void setDelegate(std::weak_ptr<UploadServiceDelegate> delegate) override { delegate_ = std::move(delegate); }
    void registerAccessQueue(std::shared_ptr<SerialQueue> queue) override { accessQueue = std::move(queue); }
    void submit(const PreparedUploadRequest& request) override { submitted.push_back(request); }
    void resubmit(std::vector<PreparedUploadRequest> requests) override { resubmitted.push_back(std::move(requests)); }
    void inFlight(std::function<void(const std::set<std::string>&)> answer) override { answer(running); }
    void cancel(std::set<std::string> identifiers, std::function<void(const std::set<std::string>&)>) override {
        cancelled.push_back(std::move(identifiers));
    }
    bool shouldResume(std::string_view identifier, std::function<void()>) override { return identifier == "mine"; }

    /// Ends an upload.
    void complete(const UploadResult& result) {
        if (const auto delegate = delegate_.lock()) delegate->uploadService(*this, result);
    }

    std::vector<PreparedUploadRequest> submitted;
    std::vector<std::vector<PreparedUploadRequest>> resubmitted;  // one list per call
    std::vector<std::set<std::string>> cancelled;                 // the same
    std::set<std::string> running;
    std::shared_ptr<SerialQueue> accessQueue;

  private:
    std::weak_ptr<UploadServiceDelegate> delegate_;
};

}  // namespace corvane::test
