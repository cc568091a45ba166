#include <corvane/Platform/PrivateFile.h>

#include <corvane/Platform/Descriptor.h>
#include <corvane/Platform/Error.h>
#include <corvane/Platform/UUID.h>

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <ctime>
#include <memory>

namespace corvane {

namespace {

constexpr std::string_view partialExtension = ".partial";

bool writeAll(int descriptor, std::string_view contents) {
    while (!contents.empty()) {
        const ssize_t count = ::write(descriptor, contents.data(), contents.size());
        if (count < 0 && errno == EINTR) continue;
        if (count < 0) return false;
        contents.remove_prefix(static_cast<std::size_t>(count));
    }
    return true;
}

// What a file system does not know how to do for a directory it does by itself.
bool sync(int descriptor, bool isDirectory) {
    while (::fsync(descriptor) != 0) {
        if (errno == EINTR) continue;
        return isDirectory && (errno == EINVAL || errno == ENOTSUP);
    }
    return true;
}

void sync(const std::filesystem::path& path, bool isDirectory) {
    const Descriptor opened(::open(path.c_str(), O_RDONLY | O_CLOEXEC | (isDirectory ? O_DIRECTORY : O_NONBLOCK)));
    if (!opened || !sync(opened.get(), isDirectory)) throw SystemError("write to the disk " + path.string(), errno);
}

/// A file beside `target` that holds `contents`; removed at the end unless it was renamed.
class PartialFile {
  public:
    PartialFile(const std::filesystem::path& target, std::string_view contents, Durability durability)
        : path_(partialPath(target.native())) {
        Descriptor descriptor(::open(path_.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600));
        if (descriptor.get() < 0) throw SystemError("create file " + target.string(), errno);
        const bool isSynced = durability == Durability::powerCut;
        if (!writeAll(descriptor.get(), contents) || (isSynced && !sync(descriptor.get(), false)) ||
            !descriptor.close()) {
            const int error = errno;
            ::unlink(path_.c_str());
            throw SystemError("write file " + target.string(), error);
        }
    }
    PartialFile(const PartialFile&) = delete;
    PartialFile& operator=(const PartialFile&) = delete;
    ~PartialFile() {
        if (!path_.empty()) ::unlink(path_.c_str());
    }

    [[nodiscard]] const char* path() const { return path_.c_str(); }
    void keep() { path_.clear(); }

  private:
    // Each step between text and path would take the name apart anew.
    [[nodiscard]] static std::string partialPath(const std::string& target) {
        const auto name = target.rfind('/') + 1;  // 0 where there is none
        return target.substr(0, name)
            .append(".")
            .append(target, name)
            .append(".")
            .append(newUUID())
            .append(partialExtension);
    }

    std::string path_;
};

}  // namespace

void replacePrivateFile(const std::filesystem::path& file, std::string_view contents, Durability durability) {
    PartialFile partial(file, contents, durability);
    if (::rename(partial.path(), file.c_str()) != 0) throw SystemError("write file " + file.string(), errno);
    partial.keep();
    if (durability == Durability::powerCut) syncDirectory(file.parent_path());
}

// Once linked the file is never written again, so a power cut must not leave the name without the contents.
bool createPrivateFile(const std::filesystem::path& file, std::string_view contents) {
    const PartialFile partial(file, contents, Durability::powerCut);
    if (::link(partial.path(), file.c_str()) == 0) {
        syncDirectory(file.parent_path());
        return true;
    }
    if (errno == EEXIST) return false;
    throw SystemError("create file " + file.string(), errno);
}

// The name is in its place by then: most file systems write it with the contents.
void syncFile(const std::filesystem::path& file) {
    sync(file, false);
    syncDirectory(file.parent_path());
}

void syncDirectory(const std::filesystem::path& directory) {
    sync(directory.empty() ? std::filesystem::path(".") : directory, true);
}

bool isPartialFile(std::string_view name) noexcept {
    return name.starts_with('.') && name.ends_with(partialExtension);
}

void removeAbandonedPartialFiles(const std::filesystem::path& directory) noexcept {
    const std::unique_ptr<DIR, int (*)(DIR*)> opened(::opendir(directory.c_str()), ::closedir);
    if (!opened) return;
    const int at = ::dirfd(opened.get());
    const std::time_t oldest = std::time(nullptr) - std::time_t{60} * 60;
    while (const dirent* entry = ::readdir(opened.get())) {
        struct stat status {};
        const bool isAbandoned = isPartialFile(entry->d_name) &&
                                 ::fstatat(at, entry->d_name, &status, AT_SYMLINK_NOFOLLOW) == 0 &&
                                 S_ISREG(status.st_mode) && status.st_mtime < oldest;
        if (isAbandoned) ::unlinkat(at, entry->d_name, 0);
    }
}

// Whoever puts a pipe in the file's place must not make the reader wait for the other end.
std::string readWholeFile(const std::filesystem::path& file) {
    const Descriptor descriptor(::open(file.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
    struct stat status {};
    if (descriptor.get() < 0 || ::fstat(descriptor.get(), &status) != 0) {
        throw SystemError("read file " + file.string(), errno);
    }
    if (S_ISDIR(status.st_mode)) throw SystemError("read file " + file.string(), EISDIR);
    if (!S_ISREG(status.st_mode)) throw SystemError("read file " + file.string(), EINVAL);
    std::string contents(static_cast<std::size_t>(status.st_size), '\0');
    std::size_t size = 0;
    while (size < contents.size()) {
        const ssize_t count = ::read(descriptor.get(), contents.data() + size, contents.size() - size);
        if (count < 0 && errno == EINTR) continue;
        if (count < 0) throw SystemError("read file " + file.string(), errno);
        if (count == 0) break;
        size += static_cast<std::size_t>(count);
    }
    contents.resize(size);
    return contents;
}

}  // namespace corvane
