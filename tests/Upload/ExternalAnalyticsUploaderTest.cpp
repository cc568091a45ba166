#include <corvane/Upload/ExternalAnalyticsUploader.h>

#include <corvane/Transfer/TransferError.h>

#include "tests/support/Testing.h"

namespace corvane {
namespace {

using Result = ExternalResult<TransferResponse>;
using Reply = test::ScriptedServer::Reply;

Result submit(const std::string& url) {
    const auto promise = std::make_shared<std::promise<Result>>();  // the setter may come back after the waiter
    auto future = promise->get_future();
    ExternalAnalyticsUploader().submitExternalAnalytics(  // and goes on without it
        url, [promise](const Result& result) { promise->set_value(result); });
    if (future.wait_for(std::chrono::seconds(10)) != std::future_status::ready) std::abort();
    return future.get();
}

TEST(ExternalAnalyticsUploader, TellsAnswersFromErrorsAndFromWhatIsNotHTTP) {
    test::ScriptedServer server;
    server.script(Reply::status(500, {{"X-Id", "7"}}));
    server.script(Reply::partial(Reply::Ending::reset));
    server.script(Reply::raw("garbage"));
    const auto response = submit(server.url("/seen?id=7")).valueOrNil();
    ASSERT_TRUE(response);
    EXPECT_EQ(response->statusCode, 500) << "any answer is a success";
    EXPECT_EQ(response->headers.at("X-Id"), "7");
    EXPECT_EQ(server.requests()[0].method + server.requests()[0].path, "GET/seen?id=7");
    EXPECT_EQ(submit(server.url()).valueOrNil().value().statusCode, 200) << "an answer goes before an error";
    const auto refused = submit(server.url());
    EXPECT_TRUE(std::get<Result::Failed>(refused.result).error.as<TransferError>());
    for (const char* url : {"file:///no/such/file", "no url"}) EXPECT_FALSE(submit(url).valueOrNil()) << url;
    const auto notHTTP = submit("file:///dev/null");
    EXPECT_TRUE(std::get<Result::Failed>(notHTTP.result).error.as<ExternalAnalyticsUploader::Errors>());
}

}  // namespace
}  // namespace corvane
