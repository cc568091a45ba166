#include <corvane/Platform/RecordingSwitch.h>

#include <corvane/Platform/Date.h>
#include <corvane/Platform/Descriptor.h>
#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Platform/Error.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/Mutex.h>
#include <corvane/Platform/PrivateFile.h>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <chrono>
#include <cstdint>
#include <exception>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>
#include <thread>
#include <utility>

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

/// The next word of the text, which it is taken off.
std::string_view takeWord(std::string_view& text) {
    const auto length = std::min(text.find_first_of(" \n"), text.size());
    const auto word = text.substr(0, length);
    text.remove_prefix(std::min(length + 1, text.size()));
    return word;
}

std::int64_t takeNumber(std::string_view& text) {
    const auto word = takeWord(text);
    std::int64_t number = 0;
    std::from_chars(word.data(), word.data() + word.size(), number);
    return std::clamp<std::int64_t>(number, 0, std::int64_t{1} << 62);  // there is always a next one
}

/// Keeps other processes from writing, and other threads; they ask the same way. A process that was stopped in the
/// midst of it must not hold the others up for good.
class WriteLock {
  public:
    explicit WriteLock(const std::filesystem::path& directory)
        : directory_(::open(directory.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC)) {
        const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(5);
        while (!directory_ || ::flock(directory_.get(), LOCK_EX | LOCK_NB) != 0) {
            const bool isTaken = directory_ && (errno == EWOULDBLOCK || errno == EINTR);
            if (!isTaken || std::chrono::steady_clock::now() >= deadline) {
                throw SystemError("lock directory " + directory.string(), errno);
            }
            std::this_thread::sleep_for(std::chrono::milliseconds(5));
        }
    }

    WriteLock(const WriteLock&) = delete;
    WriteLock& operator=(const WriteLock&) = delete;
    // A child made by fork meanwhile has the descriptor, too, and would keep the lock for as long as it lives.
    ~WriteLock() { ::flock(directory_.get(), LOCK_UN); }

  private:
    const Descriptor directory_;
};

}  // namespace

struct RecordingSwitch::Word {
    bool isOn = true;
    std::int64_t epoch = 0, finished = 0;

    /// What a later version writes behind this is left alone.
    static Word parse(std::string_view contents) {
        const auto answer = takeWord(contents);
        if (answer != "on" && answer != "off") {
            throw InvalidArgument(std::string(fileName) + " says neither on nor off");
        }
        Word word{.isOn = answer == "on"};
        word.epoch = takeNumber(contents);
        word.finished = takeNumber(contents);
        return word;
    }
    [[nodiscard]] std::string text() const {
        std::string text = isOn ? "on" : "off";
        if (epoch != 0) text += " " + std::to_string(epoch) + " " + std::to_string(finished);
        return text + "\n";
    }
};

struct RecordingSwitch::State {
    Mutex mutex;
    std::filesystem::path file CORVANE_GUARDED_BY(mutex);  // empty without a directory
    std::optional<FileStamp> seen CORVANE_GUARDED_BY(mutex);
    bool isUnsaved CORVANE_GUARDED_BY(mutex) = false;
    std::int64_t finishedEpoch CORVANE_GUARDED_BY(mutex) = 0;

    bool isUnread CORVANE_GUARDED_BY(mutex) = false;
    std::optional<AnyError> problem CORVANE_GUARDED_BY(mutex);  // of the last reading, until it is in the log

    void findFile() CORVANE_REQUIRES(mutex);
    void read() CORVANE_REQUIRES(mutex);
    void failToRead(bool isForGood) CORVANE_REQUIRES(mutex);
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
    epoch_ = finishedEpoch = 0;
    try {
        file = std::filesystem::absolute(DocumentsDirectory::path() / fileName);
    } catch (const std::exception&) {  // whoever saves is told
    }
    read();
}

void RecordingSwitch::State::read() {
    seen = stampOf(file);
    try {
        const auto word = seen ? Word::parse(readWholeFile(file)) : Word();
        if (word.epoch > epoch_) epoch_ = word.epoch;
        finishedEpoch = std::max(finishedEpoch, word.finished);
        if (!isUnsaved) answer_ = word.isOn ? Answer::on : Answer::off;
        isUnread = false;
    } catch (const InvalidArgument&) {
        failToRead(true);
    } catch (...) {
        failToRead(false);
    }
}

// Inside a handler. What may be readable at the next look, as when there was no descriptor left, is read again then.
void RecordingSwitch::State::failToRead(bool isForGood) {
    constexpr FileStamp ofNoFile{.size = -1};
    if (!isForGood) seen = ofNoFile;
    if (isUnsaved) return;  // this process was told
    answer_ = Answer::off;
    if (!std::exchange(isUnread, true)) problem = AnyError::current();
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

void RecordingSwitch::rewrite(const std::function<void(Word&)>& change) {
    const WriteLock writing(DocumentsDirectory::create());
    Word word;
    std::filesystem::path file;
    {
        const Lock lock(state().mutex);
        state().findFile();
        file = state().file;
        try {
            if (stampOf(file)) word = Word::parse(readWholeFile(file));
        } catch (const InvalidArgument&) {  // its answer is replaced, or off
            word.isOn = false;
        }
        // A file that somebody has removed does not turn the clock back.
        word.epoch = std::max<std::int64_t>(word.epoch, epoch_);
        word.finished = std::max(word.finished, state().finishedEpoch);
        if (state().isUnsaved) word.isOn = answer_ == Answer::on;
    }
    change(word);
    // A power cut must neither bring back what was forgotten nor leave a file that says nothing. Without the lock: a
    // caller's thread may ask, or answer anew, while the disk takes its time.
    replacePrivateFile(file, word.text(), Durability::powerCut);
    const Lock lock(state().mutex);
    if (state().file != file) return;
    if (word.isOn == (answer_ == Answer::on)) state().isUnsaved = false;
    state().finishedEpoch = std::max(state().finishedEpoch, word.finished);
    if (word.epoch > epoch_) epoch_ = word.epoch;
    state().seen.reset();  // by now it may be another's
}

void RecordingSwitch::save() {
    {
        const Lock lock(state().mutex);
        state().findFile();
        if (!state().isUnsaved) return;
    }
    rewrite([](Word&) {});
}

// The time of day, so that an epoch is a new one even where the file of the earlier ones was lost.
std::int64_t RecordingSwitch::raiseEpoch() {
    rewrite([](Word& word) { word.epoch = std::max(word.epoch + 1, millisecondsSince1970(now())); });
    return epoch_;
}

void RecordingSwitch::finishEpoch(std::int64_t epoch) {
    rewrite([&](Word& word) { word.finished = std::max(word.finished, epoch); });
}

std::int64_t RecordingSwitch::unfinishedEpoch() {
    look();
    const Lock lock(state().mutex);
    return state().finishedEpoch < epoch_ ? epoch_.load() : 0;
}

void RecordingSwitch::look() {
    {
        const Lock lock(state().mutex);
        state().findFile();
        if (stampOf(state().file) != state().seen) state().read();
    }
    state().logProblem();
}

void RecordingSwitch::leaveDirectory() {
    const Lock lock(state().mutex);
    answer_ = Answer::unknown;
}

}  // namespace corvane
