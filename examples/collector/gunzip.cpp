#include "gunzip.h"

#include "Refusal.h"

#include <zlib.h>

#include <algorithm>
#include <array>
#include <memory>

namespace collector {

namespace {

constexpr int gzipOnly = 16 + MAX_WBITS;

struct EndInflation {
    void operator()(z_stream* stream) const { inflateEnd(stream); }
};

}  // namespace

std::string gunzip(std::string_view bytes, std::size_t most) {
    z_stream stream{};
    if (inflateInit2(&stream, gzipOnly) != Z_OK) throw Refusal(500, "decompression cannot start");
    const std::unique_ptr<z_stream, EndInflation> end(&stream);
    // zlib's input pointer is not const, but it only reads.
    stream.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(bytes.data()));
    stream.avail_in = static_cast<uInt>(bytes.size());  // bodies are far smaller than 4 GiB

    std::string contents;
    std::array<char, 64 * 1024> chunk;
    int outcome = Z_OK;
    while (outcome == Z_OK) {
        stream.next_out = reinterpret_cast<Bytef*>(chunk.data());
        stream.avail_out = static_cast<uInt>(chunk.size());
        outcome = inflate(&stream, Z_NO_FLUSH);
        contents.append(chunk.data(), chunk.size() - stream.avail_out);
        if (contents.size() > most) throw Refusal(413, "the decompressed body is too large");
    }
    if (outcome == Z_BUF_ERROR) throw Refusal(400, "the gzip body is cut off");
    if (outcome != Z_STREAM_END) throw Refusal(400, "the body is not gzip");
    if (stream.avail_in > 0) throw Refusal(400, "the gzip body goes on after its end");
    return contents;
}

}  // namespace collector
