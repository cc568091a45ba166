#include <corvane/Platform/Error.h>
#include <corvane/Store/StorableValue.h>
#include <corvane/Store/StoreLocation.h>

#include <cmath>
#include <random>

#include "tests/Store/Note.h"
#include "tests/support/Testing.h"

namespace corvane::test {
namespace {

using std::numeric_limits;

TEST(StorableValue, WritesEachKindAsItsLiteral) {
    const std::pair<StorableValue, std::string> cases[] = {
        {"plain", "'plain'"},
        {"", "''"},
        {"it's '' quoted'", "'it''s '''' quoted'''"},
        {StorableValue::bytes(std::string("\x00\x0f\xa0\xff", 4)), "x'000fa0ff'"},
        {StorableValue::bytes(""), "x''"},
        {StorableValue::absent(), "NULL"},
        {std::optional<std::string>(), "NULL"},
        {std::optional<std::string>(""), "''"},
    };
    for (const auto& [value, literal] : cases) EXPECT_EQ(value.sqlLiteral(), literal);
}

TEST(StorableValue, RefusesWhatNoStatementCanHold) {
    for (const auto& value : {StorableValue(std::string("a\0b", 3)), StorableValue(std::nan(""))}) {
        std::string statement = "before";
        EXPECT_THROW(value.appendSQLLiteral(statement), InvalidArgument);
        EXPECT_EQ(statement, "before");
    }
}

TEST(StorableValue, NumbersComeBackFromTheDatabaseAsTheyWere) {
    Store<Note> store(StoreLocation::memory());
    store.createTable();
    std::mt19937_64 random(4);
    std::uniform_real_distribution<double> seconds(0, 4e9);  // dates of this century: what such columns hold
    std::vector<Note> notes{{.identifier = "n", .count = numeric_limits<std::int64_t>::min(), .weight = 1.5e308},
                            {.identifier = "n", .count = numeric_limits<std::int64_t>::max(), .weight = 100}};
    for (int i = 0; i < 500; ++i) {
        notes.push_back({.identifier = "n", .count = static_cast<std::int64_t>(random()), .weight = seconds(random)});
    }
    for (const auto& note : notes) {
        store.insert(note);
        EXPECT_EQ(store.fetchAll(), std::vector{note});
    }
}

}  // namespace
}  // namespace corvane::test
