#include <corvane/Platform/Error.h>
#include <corvane/Upload/UploadDropbox.h>
#include <corvane/Upload/UploadResponse.h>

#include "tests/support/Testing.h"
#include "tests/support/TextResource.h"

namespace corvane::test {
namespace {

int entries(const std::filesystem::path& directory) {
    const std::filesystem::directory_iterator all(directory);
    return static_cast<int>(std::distance(begin(all), end(all)));
}

TEST(UploadDropbox, KeepsOnePrivateFilePerUploadUntilItIsFinished) {
    const TemporaryDocuments documents;
    UploadDropbox dropbox(" Main Store\n");
    const TextResource resource("I");
    EXPECT_EQ(dropbox.baseURL(), documents / "com.veskar.corvane.main store.upload-dropbox");
    EXPECT_EQ(dropbox.existingFile("I"), std::nullopt);

    const auto file = dropbox.write("I", std::string("one\0", 4), resource);
    EXPECT_EQ(readFile(file), std::string("one\0", 4));
    EXPECT_EQ(permissions(file), 0600U);
    EXPECT_EQ(permissions(dropbox.baseURL()), 0700U);
    dropbox.write("I", "two", resource);
    EXPECT_EQ(readFile(file), "two");
    EXPECT_EQ(entries(dropbox.baseURL()), 1);
    EXPECT_EQ(UploadDropbox("main store").existingFile("I"), file);

    dropbox.finish("I", UploadResponse{200});
    EXPECT_FALSE(std::filesystem::exists(file));
    EXPECT_THROW(dropbox.finish("I", std::nullopt), SystemError);
    EXPECT_EQ(entries(documents.path()), 1);  // no debugging directory
}

TEST(UploadDropbox, WithDebuggingKeepsReadableCopies) {
    const TemporaryDocuments documents;
    UploadDropbox dropbox("main", true);
    dropbox.write("I", "compressed", TextResource("I", R"({ "a" : 1 })"));
    dropbox.write("J", "compressed", TextResource("J"));
    dropbox.finish("I", UploadResponse{503, {{"A", "b"}}});
    dropbox.finish("J", std::nullopt);

    const auto copies = documents / "com.veskar.corvane.main.upload-dropbox.debugging";
    EXPECT_EQ(readFile(copies / "I.request.json"), R"({"a":1})");
    EXPECT_EQ(readFile(copies / "I.response.json"), R"({"statusCode":503,"headers":{"A":"b"}})");
    EXPECT_FALSE(std::filesystem::exists(copies / "J.response.json"));
    EXPECT_EQ(permissions(copies / "I.request.json"), 0600U);

    // A document whose copy cannot be made is refused whole: the next attempt has another name, and would leave one
    // more.
    EXPECT_ANY_THROW(dropbox.write("K", "compressed", TextResource("K", "no JSON")));
    EXPECT_EQ(dropbox.existingFile("K"), std::nullopt);
}

TEST(UploadDropbox, RefusesIdentifiersThatLeaveItsDirectory) {
    const TemporaryDocuments documents;
    UploadDropbox dropbox("main");
    for (const auto& identifier : {std::string(), std::string("."), std::string(".."), std::string("../x"),
                                   std::string("a/b"), std::string("a\0b", 3)}) {
        EXPECT_THROW(dropbox.write(identifier, "x", TextResource(identifier)), InvalidArgument);
        EXPECT_THROW(dropbox.finish(identifier, std::nullopt), InvalidArgument);
        EXPECT_EQ(dropbox.existingFile(identifier), std::nullopt);
    }
}

TEST(UploadDropbox, RemovesWhatAKilledProcessLeftHalfWrittenAndNothingElse) {
    const TemporaryDocuments documents;
    UploadDropbox first("main");
    first.write("old", "x", TextResource("old"));
    const auto hoursAgo = std::filesystem::file_time_type::clock::now() - std::chrono::hours(2);
    for (const char* name : {".I.1.partial", ".J.2.partial"}) writeFile(first.baseURL() / name, "half");
    for (const char* name : {".I.1.partial", "old"}) std::filesystem::last_write_time(first.baseURL() / name, hoursAgo);

    UploadDropbox("main").write("new", "x", TextResource("new"));
    EXPECT_FALSE(std::filesystem::exists(first.baseURL() / ".I.1.partial"));
    EXPECT_TRUE(std::filesystem::exists(first.baseURL() / ".J.2.partial")) << "another process may be writing it";
    EXPECT_TRUE(first.existingFile("old") && first.existingFile("new"));
}

}  // namespace
}  // namespace corvane::test
