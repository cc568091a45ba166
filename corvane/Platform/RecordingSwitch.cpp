#include <corvane/Platform/RecordingSwitch.h>

#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Platform/Error.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/PrivateFile.h>

#include <sys/stat.h>

#include <cerrno>
#include <exception>
#include <string_view>

namespace corvane {

namespace {

constexpr const char* fileName = "com.veskar.corvane.recording";

/// The first word; what a later version writes behind it is left alone.
bool saysOn(std::string_view contents) {
    const auto word = contents.substr(0, contents.find_first_of(" \n"));
    if (word != "on" && word != "off") throw InvalidArgument("it says neither on nor off");
    return word == "on";
}

}  // namespace

RecordingSwitch& RecordingSwitch::shared() {
    static auto& instance = *new RecordingSwitch;
    return instance;
}

bool RecordingSwitch::isOn() {
    const unsigned directory = DocumentsDirectory::setting();
    if (directory_.load(std::memory_order_acquire) != directory) [[unlikely]] {
        const Lock lock(mutex_);
        turnTo(directory);
    }
    return isOn_.load(std::memory_order_relaxed);
}

void RecordingSwitch::set(bool isOn) {
    const Lock lock(mutex_);
    turnTo(DocumentsDirectory::setting());
    isUnsaved_ = true;
    isOn_ = isOn;
}

void RecordingSwitch::save() {
    const Lock lock(mutex_);
    turnTo(DocumentsDirectory::setting());
    if (!isUnsaved_) return;
    DocumentsDirectory::create();
    replacePrivateFile(file_, isOn_ ? "on\n" : "off\n");
    isUnsaved_ = false;
    seen_.reset();  // by now it may be another's
}

void RecordingSwitch::look() {
    const Lock lock(mutex_);
    turnTo(DocumentsDirectory::setting());
    if (!isUnsaved_ && stamp() != seen_) read();
}

void RecordingSwitch::turnTo(unsigned directory) {
    if (directory_.load(std::memory_order_relaxed) == directory) return;
    isUnsaved_ = false;
    file_.clear();
    try {
        file_ = std::filesystem::absolute(DocumentsDirectory::path() / fileName);
    } catch (const std::exception&) {  // whoever saves is told
    }
    read();
    directory_.store(directory, std::memory_order_release);
}

void RecordingSwitch::read() {
    seen_ = stamp();
    if (!seen_) {
        isOn_ = true;
        return;
    }
    try {
        isOn_ = saysOn(readWholeFile(file_));
    } catch (const std::exception& error) {
        isOn_ = false;
        Log::shared().error("Nothing is recorded: whether to record cannot be read, file=%{public}@, error=%{public}@",
                            file_.string(), error.what());
    }
}

// A name that cannot be looked at is not known to be absent.
std::optional<RecordingSwitch::FileStamp> RecordingSwitch::stamp() const {
    if (file_.empty()) return std::nullopt;
    struct stat status {};
    if (::stat(file_.c_str(), &status) != 0) {
        return errno == ENOENT || errno == ENOTDIR ? std::nullopt : std::optional(FileStamp());
    }
    return FileStamp{status.st_dev, status.st_ino, status.st_mtim.tv_sec, status.st_mtim.tv_nsec, status.st_size};
}

}  // namespace corvane
