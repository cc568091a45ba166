#include <corvane/Models/EventProperty.h>
#include <corvane/Models/Fields.h>

#include <gtest/gtest.h>

#include <array>
#include <map>
#include <optional>
#include <string>
#include <vector>

// What reflection can take apart, what it must leave to a descriptor, and the names it reads. Most of it is settled by
// the compiler: the test is that this file compiles.

namespace corvane {
namespace {

struct Empty {};
struct Plain {
    std::string name;
    int depth = 0;
};
struct Wide {
    std::optional<std::string> text;
    std::optional<int> number;
    std::vector<Plain> list;
    std::map<std::string, Plain> map;
    Plain nested;
    const char* literal;
    std::array<int, 3> array;
    EventProperty<Plain> property = required;
    EventProperty<Empty> other = EventProperty<Empty>::optional;
};
struct WithArray {
    int before;
    int values[3];
};
struct WithText {
    char text[8];
};
struct Derived : Plain {
    int more;
};
class Hidden {
  public:
    static constexpr auto corvaneFields() { return std::tuple{Field{"value", &Hidden::value_}}; }

  private:
    int value_ = 0;
};
union Either {
    int number;
    float real;
};
#define EIGHT(p) int p##0, p##1, p##2, p##3, p##4, p##5, p##6, p##7
struct SixtyFour {
    EIGHT(a);
    EIGHT(b);
    EIGHT(c);
    EIGHT(d);
    EIGHT(e);
    EIGHT(f);
    EIGHT(g);
    EIGHT(h);
};
struct SixtyFive {
    EIGHT(a);
    EIGHT(b);
    EIGHT(c);
    EIGHT(d);
    EIGHT(e);
    EIGHT(f);
    EIGHT(g);
    EIGHT(h);
    int i;
};

static_assert(reflection::fieldCount<Empty> == 0 && reflection::fieldCount<Plain> == 2);
static_assert(reflection::fieldCount<Wide> == 9 && reflection::fieldCount<SixtyFour> == 64);
static_assert(reflection::fieldNames<Wide>[0] == "text" && reflection::fieldNames<Wide>[8] == "other");
static_assert(reflection::fieldNames<SixtyFour>[63] == "h7");
static_assert(!reflection::Reflectable<WithArray> && !reflection::Reflectable<WithText>);
static_assert(!reflection::Reflectable<Derived> && !reflection::Reflectable<Hidden> && Record<Hidden>);
static_assert(!reflection::Reflectable<SixtyFive> && !reflection::Reflectable<Either>);
static_assert(!Record<std::string> && !Record<int>);

TEST(Reflection, VisitsFieldsInDeclarationOrderByReference) {
    SixtyFour record{};
    int next = 0;
    forEachField(record, [&](std::string_view, int& field) { field = next++; });
    EXPECT_EQ(record.a0, 0);
    EXPECT_EQ(record.d5, 29);
    EXPECT_EQ(record.h7, 63);
}

}  // namespace
}  // namespace corvane
