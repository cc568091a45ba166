#include "tests/support/TrackingFixture.h"

namespace corvane::test {
namespace {

template <class T>
struct Value {
    static constexpr std::string_view typeName = "Value";
    T value;
};
/// Takes whatever was pushed under "Value".
struct Taking {
    EventProperty<Value<int>> data = required;
};
struct Throwing {
    static constexpr std::string_view typeName = "Value";
    JSON toDict() const { throw std::runtime_error("host says no"); }
};
struct OfTheHost {
    static constexpr std::string_view typeName = "Value";
    std::string text;
    JSON toDict() const { return JSON::fromEncodedText(text); }
};

std::string objects(int levels) {
    std::string text = "{}";
    for (int i = 1; i < levels; ++i) text = R"({"a":)" + text + "}";
    return text;
}

class Input : public TrackingTest {
  protected:
    template <class D>
    std::string outcome(D data) {
        root->push(std::move(data));
        return submit<Taking>(root);
    }
};

TEST_F(Input, WhatCannotBeEncodedFailsItsEventNamesThePropertyAndHurtsNoOther) {
    using Seconds = std::chrono::sys_seconds;
    using Reals = std::chrono::time_point<std::chrono::system_clock, std::chrono::duration<double>>;
    using Words = std::map<std::string, std::string>;
    const std::string notUTF8 = ": the text is not UTF-8", notFinite = ": the number is infinite or not a number",
                      notADate = ": the date is out of range", tooDeep = ": objects and arrays nest too deep",
                      notJSON = ": what was encoded is not one JSON value";
    for (const char* text : {"\xff", "\xc0\xaf", "\xed\xa0\x80", "\xf4\x90\x80\x80", "cut \xe2\x82"}) {
        EXPECT_EQ(outcome(Value<std::string>{text}), "! data.value" + notUTF8);
    }
    const std::pair<std::string, std::string> cases[] = {
        {outcome(Value<Words>{{{"\xff", ""}}}), "! data.value.(key)" + notUTF8},
        {outcome(Value<std::map<std::string, Value<double>>>{{{"a \"key\"", {0.0 / 0.0}}}}),
         "! data.value.a \"key\".value" + notFinite},
        {outcome(Value<float>{1.0f / 0.0f}), "! data.value" + notFinite},
        {outcome(Value<std::vector<double>>{{1, -1.0 / 0.0}}), "! data.value[]" + notFinite},
        {outcome(Value<Seconds>{Seconds::max()}), "! data.value" + notADate},
        {outcome(Value<Seconds>{Seconds::min()}), "! data.value" + notADate},
        {outcome(Value<Reals>{Reals(std::chrono::duration<double>(0.0 / 0.0))}), "! data.value" + notADate},
        {outcome(Value<JSON>{JSON(objects(128))}), "! data.value" + tooDeep},
        {outcome(OfTheHost{objects(129)}), "! data" + tooDeep},
        {outcome(OfTheHost{R"({"a":)"}), "! data" + notJSON},  // it would break the document it ends up in
        {outcome(OfTheHost{"{\"a\":\"\xff\"}"}), "! data" + notJSON},
        {outcome(Value<JSON>{JSON::fromEncodedText("nothing")}), "! data.value" + notJSON},
        {outcome(Throwing{}), "! host says no"},
    };
    for (const auto& [outcome, expected] : cases) EXPECT_EQ(outcome, expected);
    EXPECT_TRUE(processor->events().empty());

    EXPECT_EQ(outcome(Value<Date>{Date::max()}), R"({"data":{"value":9223372036854}})") << "every Date has its number";
    EXPECT_EQ(outcome(Value<Seconds>{Seconds(3s)}), R"({"data":{"value":3000}})");
    EXPECT_EQ(outcome(Value<Reals>{Reals(-1.5s)}), R"({"data":{"value":-1500}})");
    EXPECT_EQ(outcome(Value<std::string>{std::string("'\"\\\0\x1f\n\x7f", 7)}),
              R"({"data":{"value":"'\"\\\u0000\u001f\n)"
              "\x7f\"}}");
}

struct NotUTF8 {
    static constexpr std::string_view typeName = "\xff";
};
struct Odd {
    static constexpr std::string_view typeName{"a\"\n\0", 4};
    EventProperty<Screen> p = required;
};

TEST_F(Input, NamesOfEveryKindFailTheirEventsOrStayUnchanged) {
    root->push(Screen{"home"});
    EXPECT_EQ(submit<NotUTF8>(root), "! metadata.name: the text is not UTF-8");
    submit<Odd>(root);
    EXPECT_EQ(processor->events().at(0).payload().text(),
              R"({"data":{"p":{"name":"home"}},"metadata":{"name":"a\"\n\u0000","version":"0.1.0"}})");

    const auto odd = root->chain("\xff")->chain("child");
    EXPECT_EQ(submit<Identified>(odd), "! event.eventPath: the text is not UTF-8");
    EXPECT_EQ(submit<ScreenView>(odd), R"({"screen":{"name":"home"}})") << "the path is not in this event";
    processor->clear();
    submit<Identified>(root->chain(std::string("a'\"\0\n", 5)));
    EXPECT_EQ(processor->events().at(0).json()["event"]["eventPath"].string(), std::string("/root/a'\"\0\n", 11));

    for (const std::string group : {"\xff", "", "quote ' and \n"}) {  // never in a document
        root->enterGroup(group);
        submit<ScreenView>(root);
        EXPECT_EQ(processor->events().back().groupName(), group);
        EXPECT_NO_THROW((void)processor->events().back().payload());
        root->leaveGroup();
    }
}

TEST_F(Input, SessionDataThatCannotBeEncodedIsLeftOutAndNamedInTheLog) {
    struct First {
        double value = 0.0 / 0.0;
    };
    struct Second {
        JSON toDict() const { return JSON::fromEncodedText("{broken"); }
    };
    struct Third {
        [[noreturn]] JSON toDict() const { throw 7; }
    };
    struct Identity {
        int mine = 7;
    };
    CapturedLog log;
    sessions->push(SessionData{"first", First{}});
    sessions->push(SessionData{"second", Second{}});
    sessions->push(SessionData{"third", Third{}});
    sessions->push(SessionData{"\xff", Screen{"x"}});
    sessions->push(SessionData{"sessionID", Identity{}});
    sessions->push(SessionData{std::string("a'\"\0", 4), Viewer{"\n", {}}});
    const auto session = processor->sessions().back();
    EXPECT_EQ(session.sessionData.text(), R"({"sessionID":")" + session.identifier + R"(","a'\"\u0000":{"id":"\n"}})");
    for (const char* error :
         {"first.value: the number is infinite or not a number", "second: what was encoded is not one JSON value",
          "(key): the text is not UTF-8", "an exception that is not a std::exception"}) {
        EXPECT_TRUE(log.has(LogLevel::error, std::string("Host code failed, call=session data, error=") + error));
    }
}

}  // namespace
}  // namespace corvane::test
