#include "LineReader.h"

#include <cstddef>
#include <limits>

namespace replay {

namespace {
constexpr std::size_t longestLine = std::size_t{1} << 20;  // servers cut off their header fields long before
}

LineReader::LineReader(std::istream& stream) : stream_(stream), buffer_(longestLine + 1) {}

bool LineReader::next() {
    stream_.getline(buffer_.data(), static_cast<std::streamsize>(buffer_.size()));
    std::streamsize count = stream_.gcount();  // with the line break, if there was one
    bytesRead_ += count;
    if (stream_.bad()) throw std::ios_base::failure("the log cannot be read");
    if (count == 0) return false;

    isTooLong_ = stream_.fail();
    if (isTooLong_) {
        stream_.clear();
        stream_.ignore(std::numeric_limits<std::streamsize>::max(), '\n');
        bytesRead_ += stream_.gcount();
    } else if (!stream_.eof()) {
        --count;
    }
    line_ = {buffer_.data(), static_cast<std::size_t>(count)};
    if (line_.ends_with('\r')) line_.remove_suffix(1);
    return true;
}

}  // namespace replay
