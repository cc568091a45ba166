#include <corvane/Models/JSON.h>

#include "tests/support/Testing.h"

namespace corvane {
namespace {

TEST(JSON, IsNothingWhenTheBytesAreNotJSON) {
    for (const std::string bytes :
         {"", "{", "{\"a\":}", "nul", "[1] x", "\"\xff\"", "{\"a\":1}}", "1e999", "[-1e309]"}) {
        EXPECT_FALSE(JSON(bytes).exists() || JSON(bytes)["a"][3]["b"].exists()) << bytes;
    }
    EXPECT_FALSE(JSON(std::string(600, '[') + std::string(600, ']')).exists()) << "nesting is bounded";
}

TEST(JSON, ViewsAreTypedAndDoNotCoerce) {
    const JSON json(R"({"i":3,"d":3.0,"h":0.5,"b":true,"s":"3","n":null,"a":[1,"x"],"o":{"k":{}}})");
    EXPECT_EQ(json["d"].integer(), 3) << "numbers of parsed text are of one kind";
    EXPECT_EQ(json["i"].double_(), 3.0);
    EXPECT_FALSE(json["h"].integer());
    EXPECT_FALSE(json["s"].integer());
    EXPECT_FALSE(json["i"].string());
    EXPECT_FALSE(json["b"].integer());
    EXPECT_EQ(std::get<std::int64_t>(*json["i"].number()), 3);
    EXPECT_EQ(std::get<bool>(*json["b"].number()), true);
    EXPECT_TRUE(json["n"].exists());
    EXPECT_EQ(json["a"][1].string(), "x");
    EXPECT_FALSE(json["a"][2].exists() || json["a"][-1].exists() || json["i"][0].exists());
    EXPECT_EQ(json.object()->size(), 8u);
    EXPECT_EQ(json["o"].object()->at("k").text(), "{}");

    const JSON own = JSON::fromEncodedText(R"({"i":3,"d":3.0})");
    EXPECT_FALSE(own["d"].integer()) << "the library's own values keep their exact kinds";
    EXPECT_FALSE(own["i"].double_());
}

TEST(JSON, WritesEveryNumberBackAsItWasRead) {
    // The last ones are known to be rounded to a neighbour by parsers that convert in steps.
    const std::string text =
        R"([0.1,-0.0,1e+300,5e-324,9007199254740993,-9223372036854775808,18446744073709551615,3.0,)"
        R"(0.30000000000000004,1.7976931348623157e+308,2.2250738585072014e-308,7.2057594037927933e+16])";
    const auto copy = JSON(text);
    const auto elements = *copy.array();
    EXPECT_EQ(elements[0].double_(), 0.1);
    EXPECT_EQ(elements[8].double_(), 0.1 + 0.2);
    EXPECT_EQ(elements[9].double_(), 1.7976931348623157e308);
    EXPECT_EQ(elements[10].double_(), 2.2250738585072014e-308);
    EXPECT_EQ(elements[6].unsignedInteger(), 18446744073709551615u);
    EXPECT_EQ(JSON(copy.text()).text(), copy.text());
}

TEST(JSON, LaysOutTextOfObjectsAndArraysAsAsked) {
    const JSON json(R"({"b":[1,{}],"a":"\u00e9\n\u0001\"/"})");
    EXPECT_EQ(json.toData(), "{\"b\":[1,{}],\"a\":\"\u00e9\\n\\u0001\\\"/\"}");
    EXPECT_EQ(json.toData({.sortedKeys = true}), "{\"a\":\"\u00e9\\n\\u0001\\\"/\",\"b\":[1,{}]}");
    EXPECT_EQ(json.toData({.prettyPrinted = true}),
              "{\n  \"b\": [\n    1,\n    {}\n  ],\n  \"a\": \"\u00e9\\n\\u0001\\\"/\"\n}");
    EXPECT_EQ(json["b"].description(), "[1, [:]]");
    EXPECT_THROW((void)JSON("42").toData(), JSONError);
    EXPECT_THROW((void)JSON("[]").payload(), JSONError);
    EXPECT_EQ(JSON(R"({"k":"v","n":1.5})").description(), R"(["k": "v", "n": 1.5])");
}

}  // namespace
}  // namespace corvane
