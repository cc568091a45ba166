#include <corvane/Platform/UUID.h>

#include <corvane/Platform/Error.h>
#include <corvane/Platform/ForkMark.h>

#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstddef>

namespace corvane {

namespace {

/// The system's entropy, read ahead for a few identifiers: a system call for each would cost as much as making the rest
/// of its event. A child made by fork reads anew, so that it never repeats its parent's.
class Entropy {
  public:
    using Bytes = std::array<unsigned char, 16>;

    const Bytes& next() {
        if (used_ == ahead_.size() || read_.isInChild()) read();
        return ahead_[used_++];
    }

  private:
    void read() {
        if (getentropy(ahead_.data(), sizeof ahead_) != 0) throw SystemError("read entropy", errno);
        used_ = 0;
        read_ = ForkMark();
    }

    std::array<Bytes, 16> ahead_{};  // as much as one call gives
    std::size_t used_ = ahead_.size();
    ForkMark read_;
};

thread_local Entropy entropy;  // nothing is destroyed with its thread, where others' last words may need it

}  // namespace

std::string newUUID() {
    std::string text;
    appendUUID(text);
    return text;
}

void appendUUID(std::string& out) {
    Entropy::Bytes bytes = entropy.next();
    bytes[6] = static_cast<unsigned char>((bytes[6] & 0x0F) | 0x40);  // version 4: random
    bytes[8] = static_cast<unsigned char>((bytes[8] & 0x3F) | 0x80);  // the variant of RFC 4122
    constexpr char digits[] = "0123456789ABCDEF";
    constexpr std::array<std::size_t, 16> places{0, 2, 4, 6, 9, 11, 14, 16, 19, 21, 24, 26, 28, 30, 32, 34};
    char text[] = "00000000-0000-0000-0000-000000000000";
    for (std::size_t i = 0; i < places.size(); ++i) {
        text[places[i]] = digits[bytes[i] >> 4];
        text[places[i] + 1] = digits[bytes[i] & 0xF];
    }
    out.append(text, sizeof text - 1);
}

bool isUUID(std::string_view text) noexcept {
    if (text.size() != 36) return false;
    for (std::size_t i = 0; i < text.size(); ++i) {
        const bool isHyphen = i == 8 || i == 13 || i == 18 || i == 23;
        const bool isDigit = (text[i] >= '0' && text[i] <= '9') || (text[i] >= 'A' && text[i] <= 'F');
        if (isHyphen ? text[i] != '-' : !isDigit) return false;
    }
    return true;
}

}  // namespace corvane
