#include <corvane/Transfer/HTTPSession.h>

#include "tests/support/ScriptedServer.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <future>
#include <memory>
#include <string>

namespace corvane {
namespace {

using test::ScriptedServer;
using Reply = ScriptedServer::Reply;

std::string outcome(HTTPSession& session, const std::string& url) {
    const auto promise = std::make_shared<std::promise<std::string>>();  // the setter may come back after the waiter
    session.get(url, [promise](const auto& response, const auto& error) {
        std::string text = !response ? "none" : response->isHTTP ? std::to_string(response->statusCode) : "not HTTP";
        promise->set_value(text + (error ? " with error" : ""));
    });
    auto future = promise->get_future();
    return future.wait_for(std::chrono::seconds(10)) == std::future_status::ready ? future.get() : "no answer";
}

TEST(HTTPSession, ReportsTheHeadOfTheAnswerOrWhatWentWrong) {
    ScriptedServer server;
    HTTPSession session({.timeWithoutProgress = std::chrono::milliseconds(300)});
    const struct {
        Reply reply;
        const char* expected;
    } cases[] = {
        {Reply::status(500, {}, "text"), "500"},
        {Reply::partial(Reply::Ending::endless), "200"},
        {Reply::partial(Reply::Ending::reset), "200 with error"},
        {Reply::raw(""), "none with error"},
        {Reply::never(), "none with error"},
    };
    for (const auto& one : cases) {
        server.script(one.reply);
        EXPECT_EQ(outcome(session, server.url("/seen")), one.expected);
    }
    EXPECT_EQ(server.requests()[0].method + server.requests()[0].path, "GET/seen");
    EXPECT_EQ(outcome(session, "file:///dev/null"), "not HTTP");
    EXPECT_EQ(outcome(session, "file:///no/such/file"), "none with error");
    EXPECT_EQ(outcome(session, "no url"), "none with error");
}

TEST(HTTPSession, LimitsConnectionsPerHostAndGoesOnAfterItsRelease) {
    ScriptedServer server;
    server.script(Reply::status(200).hold(), 5);
    const auto all = std::make_shared<std::promise<void>>();
    const auto left = std::make_shared<std::atomic<int>>(5);
    {
        HTTPSession session({.transfersPerHost = 2});
        for (int i = 0; i < 5; ++i) {
            session.get(server.url(), [all, left](auto, auto) {
                if (--*left == 0) all->set_value();
            });
        }
    }
    server.release(5);
    EXPECT_EQ(all->get_future().wait_for(std::chrono::seconds(10)), std::future_status::ready);
    EXPECT_LE(server.mostAtOnce(), 2);
}

}  // namespace
}  // namespace corvane
