#include <corvane/Context/Context.h>
#include <corvane/Context/Surroundings.h>
#include <corvane/Testing/RecordingProcessor.h>
#include <corvane/corvane.h>

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cmath>
#include <fstream>
#include <map>
#include <vector>

using namespace corvane;
using namespace corvane::test;
using detail::Surroundings;
using std::string;

namespace {

struct Started {
    EventProperty<EventData> event = EventProperty<EventData>::required;
    EventProperty<OperatingSystemInfo> system = EventProperty<OperatingSystemInfo>::required;
    EventProperty<MachineInfo> machine = EventProperty<MachineInfo>::required;
    EventProperty<LocaleInfo> locale = EventProperty<LocaleInfo>::required;
    EventProperty<ApplicationInfo> application = EventProperty<ApplicationInfo>::required;
    EventProperty<ProcessInfo> process = EventProperty<ProcessInfo>::required;
    EventProperty<DisplayInfo> display = EventProperty<DisplayInfo>::optional;
};

// A machine in a directory, and an environment.
class ContextTest : public ::testing::Test {
  protected:
    ContextTest() : root_(std::filesystem::temp_directory_path() / ("corvane-context-" + std::to_string(::getpid()))) {
        around_.root = root_;
        around_.environment = [this](const char* name) {
            const auto found = variables_.find(name);
            return found == variables_.end() ? nullptr : found->second.c_str();
        };
        std::filesystem::create_directories(root_ / "etc");
    }
    ~ContextTest() override { std::filesystem::remove_all(root_); }

    void write(const string& path, const string& text) {
        std::filesystem::create_directories((root_ / path).parent_path());
        std::ofstream(root_ / path) << text;
    }

    const std::filesystem::path root_;
    std::map<string, string> variables_;
    Surroundings around_;
};

string show(const std::optional<string>& text) {
    return text.value_or("-");
}

}  // namespace

TEST_F(ContextTest, OneCallPutsItIntoEventsAndIntoTheSession) {
    SessionManager sessions;
    const auto recording = std::make_shared<RecordingProcessor>();
    sessions.processorManager()->add(recording);
    sessions.start(Session::Kind::userEvents());
    pushContext(sessions);
    pushContext(*sessions.tracker());
    pushContext(*sessions.tracker());
    sessions.tracker()->submit<Started>();
    EXPECT_EQ(recording->checkCount(1, "Started"), "");
    const auto event = recording->only("Started");
    EXPECT_FALSE(event.at("machine.architecture").string()->empty());
    EXPECT_EQ(event.at("application.name").string(), executablePath().filename());
    EXPECT_LE(std::abs(millisecondsSince1970(now()) - *event.at("process.start").integer()), 600'000);
    EXPECT_TRUE(event.at("process.isInContainer").bool_().has_value());
    const JSON session = recording->sessions().back().sessionData;
    for (const auto& [key, property] : {std::pair("operatingSystem", "system"), std::pair("machine", "machine"),
                                        std::pair("locale", "locale"), std::pair("application", "application")}) {
        EXPECT_EQ(valueAt(session, key).text(), event.at(property).text());
    }
    EXPECT_TRUE(valueAt(session, "process").exists());
}

TEST_F(ContextTest, ReadsWhatTheSystemSaysOfItself) {
    const auto system = [&](const string& release) {
        const auto read = detail::operatingSystem(around_, release);
        return show(read.identifier) + '|' + show(read.name) + '|' + show(read.version) + '|' + show(read.kernel);
    };
    EXPECT_EQ(system("6.1.0-18-amd64"), "-|-|-|6.1");
    write("usr/lib/os-release", "ID=older\n");
    EXPECT_EQ(system("6"), "older|-|-|-");
    write("etc/os-release",
          "# ID=no\nNAME=\"A \\\"fine\\\" "
          "system\"\nID=first\nID=fine\nVERSION_ID='1\\2'\nBUILD_ID=x\nVERSION=\nNAMES=no");
    EXPECT_EQ(system("10.12"), "fine|A \"fine\" system|1\\2|10.12");
    write("etc/os-release", "ID=" + string(129, 'x') + "\nNAME=\xff\nVERSION_ID\nVERSION_ID=\"");
    EXPECT_EQ(system(".1"), "-|-|\"|-");
    // A pipe that nobody writes to holds nothing up.
    std::filesystem::remove(root_ / "etc/os-release");
    ASSERT_EQ(::mkfifo((root_ / "etc/os-release").c_str(), 0600), 0);
    EXPECT_EQ(system("6.x"), "-|-|-|-");

    constexpr std::uint64_t gibibyte = 1 << 30;
    EXPECT_EQ(detail::memoryClass(0), std::nullopt);
    EXPECT_EQ(detail::memoryClass(1), 1);
    EXPECT_EQ(detail::memoryClass(4 * gibibyte), 4);
    EXPECT_EQ(detail::memoryClass(15 * gibibyte + 5), 16);
    EXPECT_EQ(detail::memoryClass(~std::uint64_t{0}), 128);
}

TEST_F(ContextTest, ReadsLanguageAndTimeZone) {
    const auto locale = [&] {
        const auto read = detail::locale(around_);
        return show(read.language) + '|' + show(read.region) + '|' + show(read.timeZone);
    };
    EXPECT_EQ(locale(), "-|-|-");
    write("etc/timezone", "Etc/UTC\n");
    EXPECT_EQ(locale(), "-|-|Etc/UTC");
    std::filesystem::create_symlink("../usr/share/zoneinfo/America/Argentina/Buenos_Aires", root_ / "etc/localtime");
    EXPECT_EQ(locale(), "-|-|America/Argentina/Buenos_Aires");
    const std::vector<std::array<string, 3>> table{
        {"LANG", "de_AT.UTF-8", "de|AT"}, {"LC_MESSAGES", "es_419@euro", "es|419"},
        {"LC_ALL", "gsw", "gsw|-"},       {"LC_ALL", "C.UTF-8", "-|-"},
        {"LC_ALL", "de_Mueller", "de|-"}, {"LC_ALL", "Anna_AT", "-|-"},
        {"TZ", ":Europe/Vienna", "-|-"},  {"LC_ALL", "", "es|419"},
    };
    for (const auto& [name, value, expected] : table) {
        variables_[name] = value;
        EXPECT_EQ(locale().substr(0, expected.size() + 1), expected + '|') << name << '=' << value;
    }
    for (const auto& [value, zone] : std::map<string, string>{{":Europe/Vienna", "Europe/Vienna"},
                                                              {"/usr/share/zoneinfo/Asia/Kolkata", "Asia/Kolkata"},
                                                              {"UTC", "UTC"},
                                                              {"XYZ-3:17", "-"},
                                                              {"/home/anna/zone", "-"},
                                                              {":", "-"},
                                                              {"A/\xff", "-"},
                                                              {"A/" + string(63, 'x'), "-"}}) {
        variables_["TZ"] = value;
        EXPECT_EQ(show(detail::locale(around_).timeZone), zone) << value;
    }
}

TEST_F(ContextTest, ReadsProcessAndDisplay) {
    using namespace std::chrono_literals;
    const Date date = *dateFromMilliseconds(1'000'000'000'000);
    const auto process = [&] { return detail::process(around_, 7, date, 500s, 100); };
    EXPECT_FALSE(process().start || process().parent || process().isInContainer);
    write("proc/7/comm", "systemd\n");
    write("proc/self/stat", "9 (a ) b (c) S 4 5 6 7 8 9 10 11 12 13 14 15 16 17 18 19 20 21 40000 23");
    EXPECT_EQ(process().start, *dateFromMilliseconds(999'999'900'000));
    EXPECT_EQ(process().parent, "systemd");
    for (const char* line :
         {"", "9 (a", "9 (a) S 1 2", "9 (a) S 4 5 6 7 8 9 10 11 12 13 14 15 16 17 18 19 20 21 x 1"}) {
        write("proc/self/stat", line);
        EXPECT_FALSE(process().start) << line;
    }
    variables_["container"] = "lxc";
    EXPECT_TRUE(process().isInContainer);
    variables_.clear();
    write("run/systemd/container", "");
    EXPECT_TRUE(process().isInContainer);

    EXPECT_FALSE(detail::display(around_));
    variables_["DISPLAY"] = ":0";
    EXPECT_EQ(detail::display(around_)->server, "x11");
    variables_["WAYLAND_DISPLAY"] = "wayland-0";
    EXPECT_EQ(detail::display(around_)->server, "wayland");
}
