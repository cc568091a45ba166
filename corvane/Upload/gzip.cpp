#include <corvane/Upload/gzip.h>

#include <zlib.h>

#include <limits>
#include <memory>

namespace corvane {

namespace {

constexpr std::size_t outputStep = 16384;
constexpr int gzipWindowBits = 15 + 16;  // the largest window, in the gzip wrapper
constexpr int memoryLevel = 9;

struct EndDeflate {
    void operator()(z_stream* stream) const noexcept { deflateEnd(stream); }
};

/// Compresses the whole input of `stream`, which has been set up.
std::string deflated(z_stream& stream) {
    std::string output;
    int status = Z_OK;
    do {
        if (stream.total_out >= output.size()) output.resize(output.size() + outputStep);
        stream.next_out = reinterpret_cast<Bytef*>(output.data()) + stream.total_out;
        stream.avail_out = static_cast<uInt>(output.size() - stream.total_out);
        status = deflate(&stream, Z_FINISH);
    } while (status == Z_OK && stream.avail_out == 0);
    // A payload that is cut short would be signed, sent and refused like a whole one.
    if (status != Z_STREAM_END) throw GZIPError(GZIPError::failed, status);
    output.resize(stream.total_out);
    return output;
}

}  // namespace

GZIPError::GZIPError(Code code, std::int32_t status)
    : Error("Corvane.GZIPError", code, "cannot compress: zlib status " + std::to_string(status)), status_(status) {}
GZIPError::~GZIPError() = default;

std::string gzipCompressed(std::string_view bytes) {
    if (bytes.empty() || bytes.starts_with("\x1f\x8b")) return std::string(bytes);
    if (bytes.size() > std::numeric_limits<uInt>::max()) throw GZIPError(GZIPError::failed, Z_BUF_ERROR);
    z_stream stream{};
    stream.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(bytes.data()));
    stream.avail_in = static_cast<uInt>(bytes.size());
    const int status = deflateInit2_(&stream, Z_BEST_COMPRESSION, Z_DEFLATED, gzipWindowBits, memoryLevel,
                                     Z_DEFAULT_STRATEGY, "1.2.11", static_cast<int>(sizeof stream));
    if (status != Z_OK) throw GZIPError(GZIPError::failed, status);
    const std::unique_ptr<z_stream, EndDeflate> end(&stream);
    return deflated(stream);
}

}  // namespace corvane
