#include <examples/collector/Document.h>
#include <examples/collector/Refusal.h>
#include <examples/collector/gunzip.h>

#include "tests/support/Testing.h"

namespace collector {
namespace {

const std::string metadata = R"("metadata":{"version":"0.1.0","identifier":"5283AB70-14A4-4A9A-BAAD-370EE282EC6C"})";

std::string documentWith(const std::string& events) {
    return "{" + metadata + R"(,"data":{"session":{"sessionID":"S"},"events":)" + events + "}}";
}

template <class F>
std::string refusalOf(F call) {
    try {
        static_cast<void>(call());
        return {};
    } catch (const Refusal& refusal) {
        return std::to_string(refusal.status()) + " " + refusal.what();
    }
}

TEST(Document, IdentifiesItselfAndItsEvents) {
    const auto document = readDocument(documentWith(
        "[\n{\"data\":{\"event\":{\"eventID\":\"A\"},\"x\":1},\"metadata\":{\"name\":\"N\",\"version\":\"0.1.0\"}},\r\n"
        R"({"data":{},"metadata":{"name":"N","version":"0.1.0"}}])"));
    EXPECT_EQ(document.identifier, "5283AB70-14A4-4A9A-BAAD-370EE282EC6C");
    EXPECT_EQ(document.events, 2U);
    EXPECT_EQ(document.eventIDs, std::vector<std::string>{"A"});
    EXPECT_EQ(document.line.find_first_of("\r\n"), std::string::npos);
}

TEST(Document, OtherShapesAreRefusedWithTheReason) {
    const struct {
        std::string text;
        const char* place;
    } cases[] = {
        {"", "not JSON"},
        {"[1,2", "not JSON"},
        {std::string(100'000, '['), "not JSON"},
        {"null", "metadata"},
        {R"({"metadata":{"version":"0.2.0"}})", "metadata.version"},
        {R"({"metadata":{"version":"0.1.0","identifier":"x\n"}})", "metadata.identifier"},
        {"{" + metadata + "}", "data.session"},
        {"{" + metadata + R"(,"data":{"session":{}}})", "data.session.sessionID"},
        {documentWith("{}"), "data.events is"},
        {documentWith("[7]"), "data.events[0].metadata"},
        {documentWith(R"([{"data":[],"metadata":{"name":"N","version":"1"}}])"), "data.events[0].data"},
        {documentWith(R"([{"data":{},"metadata":{"name":7,"version":"1"}}])"), "data.events[0].metadata.name"},
    };
    for (const auto& [text, place] : cases) {
        const std::string refusal = refusalOf([&] { return readDocument(text); });
        EXPECT_TRUE(refusal.starts_with("400 ")) << text.substr(0, 200);
        EXPECT_NE(refusal.find(place), std::string::npos) << refusal;
    }
}

TEST(Gunzip, TakesOneWholeMemberAndNothingElse) {
    const std::string hello(
        "\x1f\x8b\x08\x00\x00\x00\x00\x00\x00\x03\xcb\x48\xcd\xc9\xc9\x07\x00\x86\xa6\x10\x36\x05\x00\x00\x00", 25);
    EXPECT_EQ(gunzip(hello, 5), "hello");
    EXPECT_EQ(refusalOf([&] { return gunzip(hello, 4); }), "413 the decompressed body is too large");
    EXPECT_EQ(refusalOf([&] { return gunzip(hello + "x", 5); }), "400 the gzip body goes on after its end");
    for (std::size_t size = 0; size < hello.size(); ++size) {
        EXPECT_EQ(refusalOf([&] { return gunzip(hello.substr(0, size), 5); }), "400 the gzip body is cut off") << size;
    }
    std::string damaged = hello;
    damaged[20] = '\0';
    EXPECT_EQ(refusalOf([&] { return gunzip(damaged, 5); }), "400 the body is not gzip");
    EXPECT_EQ(refusalOf([&] { return gunzip("plain text", 5); }), "400 the body is not gzip");
}

}  // namespace
}  // namespace collector
