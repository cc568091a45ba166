#pragma once

#include "tests/Integration/Application.h"
#include "tests/support/Documents.h"
#include "tests/support/Testing.h"

#include <corvane/Processing/UploadBatchEntity.h>
#include <corvane/Store/DeferredStore.h>
#include <corvane/Upload/SignedEntity.h>

namespace corvane::test {

/// A documents directory, a log and a healthy server of its own, and a look at what lies on disk for the endpoint
/// "main".
struct FaultFixture {
    [[nodiscard]] std::filesystem::path database() const { return documents / "com.veskar.corvane.main.db"; }
    [[nodiscard]] std::filesystem::path dropbox() const { return documents / "com.veskar.corvane.main.upload-dropbox"; }

    [[nodiscard]] std::vector<std::filesystem::path> payloads() const { return filesIn(dropbox()); }
    /// The rows of documents that are not finished. Requires: there is a database.
    [[nodiscard]] static std::vector<SignedEntity> rows() {
        return Store<SignedEntity>(StoreLocation::default_("main")).fetchAll();
    }
    [[nodiscard]] std::size_t distinctEvents() const {
        const auto arrived = eventIDs(server.documents());
        return std::set<std::string>(arrived.begin(), arrived.end()).size();
    }
    /// Runs the application once more, with nothing of its own to say, until its predecessors' documents are out.
    DeliveryReport runAgain() {
        Application application(server.url());
        const auto report = application.wait();
        application.abandon();
        return report;
    }

    CapturedLog log;
    TemporaryDocuments documents;
    ScriptedServer server;
};

}  // namespace corvane::test
