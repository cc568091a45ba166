#pragma once

#include <cstdint>
#include <istream>
#include <string_view>
#include <vector>

namespace replay {

/// Reads a stream line by line in bounded memory: of a line longer than the bound only the beginning is kept.
class LineReader {
  public:
    explicit LineReader(std::istream& stream);

    /// Goes to the next line; returns whether there is one. Throws `std::ios_base::failure` when reading fails.
    bool next();

    /// The line without its break, LF or CR LF. Good until `next`.
    [[nodiscard]] std::string_view line() const { return line_; }
    [[nodiscard]] bool isTooLong() const { return isTooLong_; }
    /// How far the stream has been read.
    [[nodiscard]] std::int64_t bytesRead() const { return bytesRead_; }

  private:
    std::istream& stream_;
    std::vector<char> buffer_;
    std::string_view line_;
    bool isTooLong_ = false;
    std::int64_t bytesRead_ = 0;
};

}  // namespace replay
