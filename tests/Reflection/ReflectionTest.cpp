#include <corvane/Models/EventProperty.h>
#include <corvane/Models/Fields.h>

#include <array>

#include "tests/support/Testing.h"

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
    std::map<std::string, Plain> map;
    Plain nested;
    std::array<int, 3> array;
    EventProperty<Plain> property = required;
};
class Hidden {
  public:
    static constexpr auto corvaneFields() { return std::tuple{Field{"value", &Hidden::value_}}; }

  private:
    int value_ = 0;
};
#define EIGHT(p) p##0, p##1, p##2, p##3, p##4, p##5, p##6, p##7
#define THIRTY_TWO(p) EIGHT(p##a), EIGHT(p##b), EIGHT(p##c), EIGHT(p##d)
struct SixtyFour {
    int THIRTY_TWO(a), THIRTY_TWO(b);
};
struct SixtyFive {
    int THIRTY_TWO(a), THIRTY_TWO(b), c;
};

static_assert(reflection::fieldCount<Empty> == 0 && reflection::fieldCount<Plain> == 2);
static_assert(reflection::fieldCount<Wide> == 5 && reflection::fieldCount<SixtyFour> == 64);
static_assert(reflection::fieldNames<Wide>[0] == "text" && reflection::fieldNames<Wide>[4] == "property");
static_assert(reflection::fieldNames<SixtyFour>[63] == "bd7");
static_assert(!reflection::Reflectable<Hidden> && Record<Hidden>);
static_assert(!reflection::Reflectable<SixtyFive>);
static_assert(!Record<std::string> && !Record<int>);

TEST(Reflection, VisitsFieldsInDeclarationOrderByReference) {
    SixtyFour record{};
    int next = 0;
    forEachField(record, [&](std::string_view, int& field) { field = next++; });
    EXPECT_EQ(record.aa0, 0);
    EXPECT_EQ(record.ad5, 29);
    EXPECT_EQ(record.bd7, 63);
}

}  // namespace
}  // namespace corvane
