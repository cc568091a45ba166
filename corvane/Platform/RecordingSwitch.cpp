#include <corvane/Platform/RecordingSwitch.h>

#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Platform/Error.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/Mutex.h>
#include <corvane/Platform/PrivateFile.h>

#include <sys/stat.h>

#include <cerrno>
#include <cstdint>
#include <exception>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>

namespace corvane {

namespace {

constexpr const char* fileName = "com.veskar.corvane.recording";

struct FileStamp {
    std::uint64_t device = 0, node = 0;
    std::int64_t seconds = 0, nanoseconds = 0, size = 0;
    bool operator==(const FileStamp&) const = default;
};

// A name that cannot be looked at is not known to be absent.
std::optional<FileStamp> stampOf(const std::filesystem::path& file) {
    struct stat status {};
    if (file.empty()) return std::nullopt;
    if (::stat(file.c_str(), &status) != 0) {
        return errno == ENOENT || errno == ENOTDIR ? std::nullopt : std::optional(FileStamp());
    }
    return FileStamp{status.st_dev, status.st_ino, status.st_mtim.tv_sec, status.st_mtim.tv_nsec, status.st_size};
}

/// The first word; what a later version writes behind it is left alone.
bool saysOn(std::string_view contents) {
    const auto word = contents.substr(0, contents.find_first_of(" \n"));
    if (word != "on" && word != "off") throw InvalidArgument(std::string(fileName) + " says neither on nor off");
    return word == "on";
}

}  // namespace

struct RecordingSwitch::State {
    Mutex mutex;
    std::filesystem::path file CORVANE_GUARDED_BY(mutex);  // empty without a directory
    std::optional<FileStamp> seen CORVANE_GUARDED_BY(mutex);
    bool isUnsaved CORVANE_GUARDED_BY(mutex) = false;

    std::optional<AnyError> problem CORVANE_GUARDED_BY(mutex);  // of the last reading, until it is in the log

    void findFile() CORVANE_REQUIRES(mutex);
    void read() CORVANE_REQUIRES(mutex);
    void logProblem();
};

RecordingSwitch::State& RecordingSwitch::state() {
    static auto& instance = *new State;
    return instance;
}

void RecordingSwitch::State::findFile() {
    if (answer_ != Answer::unknown) return;
    isUnsaved = false;
    file.clear();
    try {
        file = std::filesystem::absolute(DocumentsDirectory::path() / fileName);
    } catch (const std::exception&) {  // whoever saves is told
    }
    read();
}

void RecordingSwitch::State::read() {
    seen = stampOf(file);
    try {
        answer_ = !seen || saysOn(readWholeFile(file)) ? Answer::on : Answer::off;
    } catch (...) {
        answer_ = Answer::off;
        problem = AnyError::current();
    }
}

// Without the lock: the log's sink is the host's, and may call what takes it.
void RecordingSwitch::State::logProblem() {
    std::optional<AnyError> told;
    {
        const Lock lock(mutex);
        told.swap(problem);
    }
    if (told)
        Log::shared().error("Nothing is recorded: whether to record is not known, error=%{public}@", told->what());
}

bool RecordingSwitch::find() {
    bool isOn = false;
    {
        const Lock lock(state().mutex);
        state().findFile();
        isOn = answer_ == Answer::on;
    }
    state().logProblem();
    return isOn;
}

void RecordingSwitch::set(bool isOn) {
    const Lock lock(state().mutex);
    state().findFile();
    state().isUnsaved = true;
    answer_ = isOn ? Answer::on : Answer::off;
}

void RecordingSwitch::save() {
    const Lock lock(state().mutex);
    state().findFile();
    if (!state().isUnsaved) return;
    DocumentsDirectory::create();
    replacePrivateFile(state().file, answer_ == Answer::on ? "on\n" : "off\n");
    state().isUnsaved = false;
    state().seen.reset();  // by now it may be another's
}

void RecordingSwitch::look() {
    {
        const Lock lock(state().mutex);
        state().findFile();
        if (!state().isUnsaved && stampOf(state().file) != state().seen) state().read();
    }
    state().logProblem();
}

void RecordingSwitch::leaveDirectory() {
    const Lock lock(state().mutex);
    answer_ = Answer::unknown;
}

}  // namespace corvane
