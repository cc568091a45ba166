#include <corvane/Upload/gzip.h>

#include <corvane/Platform/Mutex.h>

#include <zlib.h>

#include <limits>
#include <memory>
#include <utility>

namespace corvane {

namespace {

constexpr std::size_t outputStep = 16384;
constexpr std::size_t mostKept = 16 * outputStep;  // of the output of a document that was large
constexpr int gzipWindowBits = 15 + 16;            // the largest window, in the gzip wrapper
constexpr int memoryLevel = 9;

/// A compression that is set up.
class Deflater {
  public:
    Deflater() {
        const int status = deflateInit2_(&stream_, Z_BEST_COMPRESSION, Z_DEFLATED, gzipWindowBits, memoryLevel,
                                         Z_DEFAULT_STRATEGY, "1.2.11", static_cast<int>(sizeof stream_));
        if (status != Z_OK) throw GZIPError(GZIPError::failed, status);
    }
    Deflater(const Deflater&) = delete;
    Deflater& operator=(const Deflater&) = delete;
    ~Deflater() { deflateEnd(&stream_); }

    [[nodiscard]] std::string compress(std::string_view bytes);
    /// Makes it ready for the next input; false when it cannot be used any more.
    [[nodiscard]] bool reset() noexcept {
        if (output_.size() > mostKept) std::string().swap(output_);
        return deflateReset(&stream_) == Z_OK;
    }

  private:
    z_stream stream_{};
    std::string output_;
};

std::string Deflater::compress(std::string_view bytes) {
    z_stream& stream = stream_;
    stream.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(bytes.data()));
    stream.avail_in = static_cast<uInt>(bytes.size());
    int status = Z_OK;
    do {
        if (stream.total_out >= output_.size()) output_.resize(output_.size() + outputStep);
        stream.next_out = reinterpret_cast<Bytef*>(output_.data()) + stream.total_out;
        stream.avail_out = static_cast<uInt>(output_.size() - stream.total_out);
        status = deflate(&stream, Z_FINISH);
    } while (status == Z_OK && stream.avail_out == 0);
    // A payload that is cut short would be signed, sent and refused like a whole one.
    if (status != Z_STREAM_END) throw GZIPError(GZIPError::failed, status);
    return output_.substr(0, stream.total_out);
}

/// The one that the next document uses: making its state, a quarter of a megabyte, takes as long as compressing a
/// batch.
class Spare {
  public:
    [[nodiscard]] std::unique_ptr<Deflater> take() {
        const Lock lock(mutex_);
        return std::move(deflater_);
    }
    void give(std::unique_ptr<Deflater> deflater) {
        const Lock lock(mutex_);
        deflater_.swap(deflater);
    }

  private:
    Mutex mutex_;
    std::unique_ptr<Deflater> deflater_ CORVANE_GUARDED_BY(mutex_);
};

Spare& spare() {
    static auto& instance = *new Spare;  // never destroyed: documents may be made while the process exits
    return instance;
}

}  // namespace

GZIPError::GZIPError(Code code, std::int32_t status)
    : Error("Corvane.GZIPError", code, "cannot compress: zlib status " + std::to_string(status)), status_(status) {}
GZIPError::~GZIPError() = default;

std::string gzipCompressed(std::string_view bytes) {
    if (bytes.empty() || bytes.starts_with("\x1f\x8b")) return std::string(bytes);
    if (bytes.size() > std::numeric_limits<uInt>::max()) throw GZIPError(GZIPError::failed, Z_BUF_ERROR);
    auto deflater = spare().take();
    if (!deflater) deflater = std::make_unique<Deflater>();
    auto compressed = deflater->compress(bytes);
    if (deflater->reset()) spare().give(std::move(deflater));
    return compressed;
}

}  // namespace corvane
