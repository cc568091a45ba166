#include <corvane/Platform/Bytes.h>
#include <corvane/Signing/FileSigningService.h>
#include <corvane/Signing/SHA1.h>
#include <corvane/Signing/SigningError.h>
#include <corvane/Testing/ProcessSettings.h>
#include <corvane/Upload/OstrelSigner.h>

#include <sys/stat.h>

#include "tests/support/Documents.h"
#include "tests/support/Testing.h"

namespace corvane::test {
namespace {

TEST(OstrelSigner, SignsTheDigestAndPassesTheServicesErrorOn) {
    struct Service final : SigningServiceType {
        std::string sign(std::string_view digest) override {
            if (hexString(digest) == "da39a3ee5e6b4b0d3255bfef95601890afd80709") return std::string("\x00\xff", 2);
            throw SigningError(SigningError::failed, "no hardware");
        }
    };
    const CapturedLog log;
    ProcessSettings settings;
    settings.setSigning(std::make_shared<Service>());
    OstrelSigner signer;
    EXPECT_EQ(signer.sign(""), "AP8=");
    EXPECT_THROW(static_cast<void>(signer.sign("body")), SigningError);
    EXPECT_TRUE(log.has(LogLevel::error, "Failed to sign our data, error=cannot sign: no hardware"));
}

TEST(FileSigningService, MakesAPrivateKeyOnceThatOthersCanVerify) {
    const TemporaryDocuments documents;
    const auto keyFile = documents / FileSigningService::keyFileName;
    const auto publicFile = documents / FileSigningService::publicKeyFileName;
    const std::string digest = sha1Digest("body");

    const auto signature = FileSigningService().sign(digest);
    EXPECT_EQ(permissions(keyFile), 0600U);
    const auto key = readFile(keyFile);
    EXPECT_TRUE(verifies(readFile(publicFile), digest, base64String(signature)));
    EXPECT_FALSE(verifies(readFile(publicFile), sha1Digest("another"), base64String(signature)));

    std::filesystem::remove(publicFile);
    EXPECT_EQ(FileSigningService().sign(digest), signature);  // the same key in the next run
    EXPECT_EQ(readFile(keyFile), key);
    EXPECT_TRUE(std::filesystem::exists(publicFile));
}

TEST(FileSigningService, ThoseWhoRaceForTheFirstUseAgreeOnOneKey) {
    const TemporaryDocuments documents;
    std::vector<std::future<std::string>> racing;
    for (int i = 0; i < 8; ++i) {
        racing.push_back(std::async(std::launch::async, [] { return FileSigningService().sign("digest"); }));
    }
    std::set<std::string> signatures;
    for (auto& one : racing) signatures.insert(one.get());
    EXPECT_EQ(signatures.size(), 1U);
}

TEST(FileSigningService, SaysWhatIsWrongWithItsKeyFile) {
    const TemporaryDocuments documents;
    writeFile(documents / FileSigningService::keyFileName, "no key");
    FileSigningService service;
    EXPECT_THROW(static_cast<void>(service.sign("digest")), SigningError);
    std::filesystem::remove(documents / FileSigningService::keyFileName);
    EXPECT_EQ(service.sign("digest").size(), 64U);  // mended

    // A pipe has nothing to wait for, in the place of either half.
    std::filesystem::remove(documents / FileSigningService::publicKeyFileName);
    ASSERT_EQ(mkfifo((documents / FileSigningService::publicKeyFileName).c_str(), 0600), 0);
    EXPECT_EQ(FileSigningService().sign("digest").size(), 64U);
    std::filesystem::remove(documents / FileSigningService::keyFileName);
    ASSERT_EQ(mkfifo((documents / FileSigningService::keyFileName).c_str(), 0600), 0);
    EXPECT_THROW(static_cast<void>(FileSigningService().sign("digest")), SystemError);

    writeFile(documents / "file", "");
    EXPECT_THROW(static_cast<void>(FileSigningService(documents / "file").sign("digest")), SystemError);
}

/// Signs in a static destructor, which runs after the exit handlers that were installed after it was made.
struct SignsAtExit {
    std::unique_ptr<FileSigningService> service;
    ~SignsAtExit() {
        if (!service) return;
        try {
            static_cast<void>(service->sign("digest"));
            std::_Exit(1);
        } catch (const SigningError& error) {
            std::_Exit(error.value() == SigningError::unavailable ? 7 : 2);
        }
    }
};

TEST(FileSigningServiceDeathTest, ThrowsOnceTheProcessExits) {
    EXPECT_EXIT(
        {
            static SignsAtExit atExit;
            const TemporaryDocuments documents;
            atExit.service = std::make_unique<FileSigningService>();
            static_cast<void>(atExit.service->sign("digest"));
            std::exit(0);
        },
        testing::ExitedWithCode(7), "");
}

}  // namespace
}  // namespace corvane::test
