#include <corvane/Platform/GZIPFile.h>

#include <zlib.h>

#include <array>
#include <memory>

namespace corvane {

namespace {

struct CloseFile {
    void operator()(gzFile file) const noexcept { gzclose_r(file); }
};

}  // namespace

bool isDamagedGZIPFile(const std::filesystem::path& file) noexcept {
    std::error_code failed;
    if (!std::filesystem::is_regular_file(file, failed)) return false;
    const std::unique_ptr<gzFile_s, CloseFile> opened(gzopen(file.c_str(), "rbe"));
    if (!opened) return false;
    std::array<char, 16384> contents;  // NOLINT(cppcoreguidelines-pro-type-member-init): written before it is read
    int count = 0;
    do {
        count = gzread(opened.get(), contents.data(), contents.size());
    } while (count > 0 && gzdirect(opened.get()) == 0);
    int status = Z_OK;
    gzerror(opened.get(), &status);
    if (status == Z_OK) return gzdirect(opened.get()) != 0;
    return status == Z_DATA_ERROR || status == Z_BUF_ERROR;
}

}  // namespace corvane
