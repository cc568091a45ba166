#include <corvane/Catalogue/Catalogue.h>
#include <corvane/Catalogue/CatalogueComparison.h>

#include <corvane/Testing/ProcessSettings.h>
#include <corvane/corvane.h>

#include <examples/collector/SchemaFolder.h>
#include "tests/support/Testing.h"

namespace plain {
namespace {

using namespace corvane;

enum class Quality : std::uint8_t { standard, high };
std::string_view toText(Quality quality) {
    return quality == Quality::high ? "high" : "standard";
}
enum class Channel : std::int8_t { left = -1, right = 1 };

struct Chapter {
    std::string title;
    std::vector<Chapter> parts;
};
struct Position {
    double latitude = 0;
    JSON toDict() const { return JSON(R"({"lat":1.5})"); }
};
struct Opaque {
    void encode(Encoder& encoder) const { encoder.string("anything"); }
};
template <class T>
struct Box {
    T value;
};
struct Nothing {};
struct Everything {
    bool flag = false;
    std::int8_t small = -128;
    std::uint64_t large = ~std::uint64_t{0};
    float real = 1.5F;
    std::string text;
    Date date;
    std::chrono::seconds span{3};
    Quality quality = Quality::high;
    Channel channel = Channel::left;
    std::optional<std::optional<int>> maybe;
    std::vector<std::optional<int>> gaps{1, std::nullopt};
    std::array<std::uint16_t, 2> pair{};
    std::map<std::string, std::vector<bool>> map{{"a/b~", {true}}};
    JSON json = JSON("[1]");
    Chapter chapter{"one", {{"two", {}}}};
    Opaque opaque;
    Position place;
    Nothing nothing;
};
Everything everything(int maybe) {
    Everything all;
    all.maybe = maybe;
    return all;
}
struct Recorded {
    EventProperty<EventData> event = required;
    EventProperty<Everything> all = required;
    EventProperty<Position> position = optional;
    EventProperty<Box<Nothing>> box = optional;
    EventProperty<int> never = optional;
    int ignored = 0;
};
struct Hostile {
    static constexpr std::string_view typeName = "../x|y";
};
struct Misdescribed {
    EventProperty<Nothing> other = required;
};
struct Same {
    static constexpr std::string_view typeName = "../x|y";
    bool other = false;
};

}  // namespace
}  // namespace plain

template <>
inline constexpr auto corvane::catalogue::enumerators<plain::Quality> =
    std::array{plain::Quality::standard, plain::Quality::high};
template <>
inline constexpr auto corvane::catalogue::enumerators<plain::Channel> =
    std::array{plain::Channel::left, plain::Channel::right};
template <>
inline constexpr auto corvane::catalogue::schema<plain::Position> =
    R"({"type": "object", "properties": {"lat": {"type": "number"}}, "required": ["lat"]})";
template <>
inline constexpr auto corvane::catalogue::description<plain::Everything> = "All | kinds.";
template <>
inline constexpr auto corvane::catalogue::fieldDescriptions<plain::Everything> =
    std::to_array<corvane::catalogue::FieldDescription>({{"text", "A text."}});
template <>
inline constexpr auto corvane::catalogue::fieldDescriptions<plain::Misdescribed> =
    std::to_array<corvane::catalogue::FieldDescription>({{"othr", "Was renamed."}});

namespace corvane::test {
namespace {

using collector::SchemaFolder;
using plain::Everything;
using plain::Hostile;
using plain::Recorded;

JSON schemaOf(const std::filesystem::path& directory, const std::string& name) {
    return JSON(readFile(directory / name));
}

TEST(CatalogueTest, DescribesEveryKindOfField) {
    const TemporaryDocuments directory;
    EXPECT_TRUE(writeCatalogue<Recorded>(directory.path()));
    const JSON schema = schemaOf(directory.path(), "Recorded.schema.json");
    const JSON all = schema["$defs"]["Everything"]["properties"];
    const std::vector<std::pair<std::string, std::string>> expected{
        {"flag", R"({"type":"boolean"})"},
        {"small", R"({"type":"integer","minimum":-128,"maximum":127})"},
        {"large", R"({"type":"integer","minimum":0,"maximum":18446744073709551615})"},
        {"real", R"({"type":"number"})"},
        {"text", R"({"type":"string","description":"A text."})"},
        {"date", R"({"type":"integer","format":"milliseconds-since-1970"})"},
        {"span", R"({"type":"integer","format":"milliseconds"})"},
        {"quality", R"({"$ref":"#/$defs/Quality"})"},
        {"channel", R"({"$ref":"#/$defs/Channel"})"},
        {"maybe", R"({"type":"integer","minimum":-2147483648,"maximum":2147483647})"},
        {"pair",
         R"({"type":"array","items":{"type":"integer","minimum":0,"maximum":65535},"minItems":2,"maxItems":2})"},
        {"map", R"({"type":"object","additionalProperties":{"type":"array","items":{"type":"boolean"}}})"},
        {"json", "{}"},
        {"chapter", R"({"$ref":"#/$defs/Chapter"})"},
        {"place", R"({"$ref":"#/$defs/Position"})"},  // a field's fields are written, and not its toDict
    };
    for (const auto& [field, text] : expected) EXPECT_EQ(all[field].text(), text) << field;
    EXPECT_EQ(all["gaps"]["items"]["anyOf"][1].text(), R"({"type":"null"})");
    EXPECT_EQ(schema["$defs"]["Quality"]["enum"].text(), R"(["standard","high"])");
    EXPECT_EQ(schema["$defs"]["Channel"]["enum"].text(), "[-1,1]");
    EXPECT_EQ(schema["$defs"]["Chapter"]["properties"]["parts"]["items"].text(), R"({"$ref":"#/$defs/Chapter"})");
    EXPECT_EQ(schema["$defs"]["Position"]["required"].text(), R"(["latitude"])");
    EXPECT_EQ(schema["$defs"]["plain::(anonymous namespace)::Position"]["required"].text(), R"(["lat"])");
    EXPECT_EQ(schema["properties"]["position"].text(),
              R"({"$ref":"#/$defs/plain::(anonymous%20namespace)::Position"})");
    EXPECT_EQ(schema["properties"]["box"].text(), R"({"$ref":"#/$defs/Box%3CNothing%3E"})");
    EXPECT_EQ(schema["properties"]["never"].text(), R"({"type":"object"})");
    EXPECT_EQ(schema["required"].text(), R"(["event","all"])");
    EXPECT_FALSE(schema["$defs"]["Everything"]["required"].text().find("maybe") != std::string::npos);
    const std::string page = readFile(directory / "catalogue.md");
    EXPECT_NE(page.find("All \\| kinds."), std::string::npos);
    EXPECT_NE(page.find("| text | text | required | A text. |"), std::string::npos) << page;
}

/// Whether another validator finds the schemas to be such, and the document to match them.
void checkByOthers(const std::filesystem::path& directory, const JSON& document) {
#ifdef CORVANE_SCHEMA_CHECK
    const std::string file = (directory / "document.json").string();
    writeFile(file, document.text());
    EXPECT_EQ(std::system((CORVANE_SCHEMA_CHECK " " + directory.string() + " " + file).c_str()), 0);
    writeFile(file, R"({"metadata":{"version":"0.1.0","identifier":"x"},"data":{"session":{},"events":[]}})");
    EXPECT_NE(std::system((CORVANE_SCHEMA_CHECK " " + directory.string() + " " + file).c_str()), 0);
#else
    std::cerr << "not looked at by another validator: " << directory << document.text() << "\n";
#endif
}

/// Documents as a collector gets them.
std::vector<JSON> upload(const std::function<void(SessionManager&)>& use) {
    const TemporaryDocuments documents;
    ProcessSettings settings;
    settings.setTransfers(InProcessTransferSession::factory());
    ScriptedServer server;
    SessionManager sessions;
    const auto uploads = std::make_shared<UploadBatchEventProcessor>(Client{"com.example.test", "Test", "1", 1},
                                                                     Endpoint{server.url("/in"), "catalogue"});
    sessions.processorManager()->add(uploads);
    sessions.start(Session::Kind::userEvents());
    use(sessions);
    sessions.endSync();
    EXPECT_EQ(uploads->waitForDelivery(std::chrono::steady_clock::now() + 10s).delivered.documents, 1);
    return server.documents();
}

TEST(CatalogueTest, DocumentsAsTheyAreUploadedMatchAndOthersDoNot) {
    const TemporaryDocuments directory;
    (void)writeCatalogue<Recorded, Hostile>(directory.path(), {catalogue::sessionData<Everything>("all")});
    const SchemaFolder schemas(directory.path());
    const auto documents = upload([](SessionManager& sessions) {
        sessions.push(SessionData{"all", Everything{}});
        sessions.push(SessionData{"undeclared", Everything{}});
        sessions.tracker()->push(plain::everything(3));
        sessions.tracker()->push(plain::Position{});
        sessions.tracker()->submit<Recorded>();
        sessions.tracker()->submit<Hostile>();
    });
    ASSERT_EQ(documents.size(), 1U);
    EXPECT_EQ(schemas.check(documents[0]).lines, std::vector<std::string>{});
    checkByOthers(directory.path(), documents[0]);

    const std::string text = documents[0].text();
    const auto changed = [&](const std::string& from, const std::string& to) {
        std::string document = text;
        document.replace(document.rfind(from), from.size(), to);
        const auto report = schemas.check(JSON(document));
        return report.lines.empty() ? "matches" : report.lines.front();
    };
    const std::vector<std::tuple<std::string, std::string, std::string>> cases{
        {"\"small\":-128", "\"small\":-129", "data.events[0] Recorded: data.all.small is -129, less than -128"},
        {"18446744073709551615", "1e30",
         "data.events[0] Recorded: data.all.large is 1e+30, which is not of type integer"},
        {"\"flag\":false", "\"flag\":0", "data.events[0] Recorded: data.all.flag is 0, which is not of type boolean"},
        {"\"flag\":false,", "", "data.events[0] Recorded: data.all.flag is missing"},
        {"\"high\"", "\"low\"",
         "data.events[0] Recorded: data.all.quality is \"low\", which is not among the values that it may have"},
        {"[1,null]", "[1,\"\\u001b\"]",
         "data.events[0] Recorded: data.all.gaps[1] is \"\\u001b\", which is not of type integer"},
        {"\"pair\":[0,0]", "\"pair\":[0]", "data.events[0] Recorded: data.all.pair has 1 elements"},
        {"[true]", "[null]", "data.events[0] Recorded: data.all.map.a/b~[0] is null, which is not of type boolean"},
        {"\"lat\":1.5", "\"let\":1.5", "data.events[0] Recorded: data.position.lat is missing"},
        {"\"../x|y\"", "\"Other\"",
         "data.events[1] Other: metadata.name is \"Other\", which is not among the values that it may have"},
        {"\"undeclared\":{", "\"undeclared\":1,\"a\":{",
         "document: data.session.undeclared is 1, which is not of type object"},
        {"\"flag\":false", "\"flag\":false,\"new\":1", "matches"},
    };
    for (const auto& [from, to, expected] : cases) EXPECT_EQ(changed(from, to), expected);
}

// What one vocabulary is called before and after a change.
namespace before {
struct Screen {
    std::string name;
    std::int32_t depth = 0;
    std::optional<std::string> plan;
    std::vector<plain::Chapter> chapters;
    Date shown;
    plain::Quality quality{};
    int gone = 0;
    std::uint8_t narrow = 0;
};
struct View {
    static constexpr std::string_view typeName = "View";
    EventProperty<Screen> screen = required;
    EventProperty<plain::Nothing> extra = required;
};
struct Left {};
}  // namespace before
namespace after {
enum class Quality { standard, high, highest };
std::string_view toText(Quality quality) {
    return quality == Quality::highest ? "highest" : "standard";
}
struct Renamed {
    std::string name;
    std::int64_t depth = 0;
    std::string plan;
    std::vector<std::optional<plain::Chapter>> chapters;
    std::chrono::milliseconds shown{};
    Quality quality{};
    int added = 0;
    bool narrow = false;
};
struct View {
    static constexpr std::string_view typeName = "View";
    EventProperty<Renamed> screen = required;
    EventProperty<plain::Nothing> extra = optional;
};
struct Entered {};
}  // namespace after

}  // namespace
}  // namespace corvane::test

template <>
inline constexpr auto corvane::catalogue::enumerators<corvane::test::after::Quality> =
    std::array{corvane::test::after::Quality::standard, corvane::test::after::Quality::high,
               corvane::test::after::Quality::highest};

namespace corvane::test {
namespace {

std::set<std::string> changesOf(const std::filesystem::path& from, const std::filesystem::path& to) {
    std::set<std::string> lines;
    for (const auto& [event, path, what, isBreaking] : compareCatalogues(from, to)) {
        lines.insert((isBreaking ? "! " : "  ") + event + " " + path + " " + what);
    }
    return lines;
}

TEST(CatalogueTest, ComparisonSaysWhatBreaksAReader) {
    const TemporaryDocuments directory;
    const auto old = directory / "old";
    const auto now = directory / "now";
    (void)writeCatalogue<before::View, before::Left>(old);
    (void)writeCatalogue<after::View, after::Entered>(now, {catalogue::sessionData<Everything>("all")});
    EXPECT_EQ(changesOf(old, old), std::set<std::string>{});
    EXPECT_EQ(changesOf(old, now), (std::set<std::string>{
                                       "! Left  is gone",
                                       "  Entered  is new",
                                       "! View extra is optional now",
                                       "! View screen.chapters[] may be null now",
                                       "! View screen.depth maximum is 9223372036854775807 now, was 2147483647",
                                       "! View screen.depth minimum is -9223372036854775808 now, was -2147483648",
                                       "! View screen.gone is gone",
                                       "  View screen.added is new",
                                       "! View screen.narrow is \"boolean\" now, was \"integer\"",
                                       "  View screen.plan is required now",
                                       "! View screen.quality may be \"highest\" now",
                                       "  View screen.quality is never \"high\" any more",
                                       "! View screen.shown has another unit or format",
                                       "  user-events data.session.all is new",
                                   }));
    const auto back = changesOf(now, old);
    EXPECT_TRUE(back.contains("  View screen.depth maximum is 2147483647 now, was 9223372036854775807"));
    EXPECT_TRUE(back.contains("  View screen.chapters[] is never null any more"));
    EXPECT_TRUE(back.contains("! View screen.plan is optional now"));
    EXPECT_THROW((void)compareCatalogues(old, directory / "nowhere"), SystemError);
    writeFile(now / "View.schema.json", "{");
    EXPECT_THROW((void)compareCatalogues(old, now), InvalidArgument);
}

TEST(CatalogueTest, WritesOnlyWhatChangesAndRemovesOnlyItsOwn) {
    const TemporaryDocuments directory;
    EXPECT_TRUE((writeCatalogue<Recorded, Hostile>(directory.path())));
    EXPECT_TRUE(std::filesystem::exists(directory / "+2E+2E+2Fx+7Cy.schema.json"));
    EXPECT_FALSE((writeCatalogue<Recorded, Hostile>(directory.path())));
    EXPECT_FALSE((writeCatalogue<Recorded, Hostile, Recorded>(directory.path())));
    writeFile(directory / "hosts-own.schema.json", "{}");
    EXPECT_TRUE((writeCatalogue<Hostile>(directory.path())));
    EXPECT_FALSE(std::filesystem::exists(directory / "Recorded.schema.json"));
    EXPECT_TRUE(std::filesystem::exists(directory / "hosts-own.schema.json"));

    EXPECT_THROW((writeCatalogue<Hostile, plain::Same>(directory.path())), InvalidArgument);
    EXPECT_THROW((writeCatalogue<plain::Misdescribed>(directory.path())), InvalidArgument);
    EXPECT_THROW(writeCatalogue<Hostile>(directory / "hosts-own.schema.json"), SystemError);
    EXPECT_THROW(writeCatalogue<Hostile>(directory.path(), {catalogue::sessionData<Everything>("sessionID")}),
                 InvalidArgument);
    std::filesystem::remove(directory / "catalogue.md");
    std::filesystem::create_directory(directory / "catalogue.md");
    EXPECT_THROW(writeCatalogue<Hostile>(directory.path()), SystemError);
}

TEST(CatalogueTest, CollectorRefusesSchemasThatItWouldNotObey) {
    const TemporaryDocuments directory;
    const std::string file = "user-events.schema.json";
    const auto errorOf = [&](const std::string& schema) -> std::string {
        writeFile(directory / file, schema);
        try {
            const SchemaFolder schemas(directory.path());
            const auto report = schemas.check(JSON("[[1]]"));
            return report.lines.empty() ? "matches" : report.lines.front();
        } catch (const std::runtime_error& error) {
            return error.what();
        }
    };
    const std::vector<std::pair<std::string, std::string>> cases{
        {"", "it cannot be read"},
        {"{", "it is not JSON"},
        {"7", "a schema is neither an object nor a boolean"},
        {R"({"pattern": "a"})", "the keyword \"pattern\" is not understood here"},
        {R"({"type": "int"})", "there is no type \"int\""},
        {R"({"type": []})", "\"type\" names none"},
        {R"({"required": "a"})", "\"required\" is not of the right type"},
        {R"({"minimum": true})", "\"minimum\" is no number"},
        {R"({"$ref": "#/$defs/a"})", "it refers to /$defs/a, which is not there"},
        {R"({"$ref": "#a"})", "it refers to an anchor, #a"},
        {R"({"$ref": "../other"})", "it is not in the directory"},
        {R"({"$ref": "#"})", "document: cannot be checked: its schema refers to itself"},
        {R"({"items": {"$ref": "#"}, "not": 1})", "the keyword \"not\" is not understood here"},
        {R"({"$defs": {"a/b~ ": {"type": "string"}}, "items": {"$ref": "#/$defs/a~1b~0%20"}})",
         "document: [0] is [1], which is not of type string"},
        {R"({"items": {"anyOf": [{"type": "integer"}, {"items": {"enum": [1.0]}, "type": "array"}]}})", "matches"},
        {"false", "document: may not be there"},
        {std::string(600, '['), "it is not JSON"},
    };
    for (const auto& [schema, expected] : cases) {
        const std::string error = errorOf(schema);
        EXPECT_TRUE(error.ends_with(expected)) << schema << "\n" << error;
    }
}

}  // namespace
}  // namespace corvane::test
