#include <corvane/Platform/UUID.h>

#include <corvane/Platform/Error.h>
#include <corvane/Platform/ForkMark.h>

#include <unistd.h>
#include <boost/uuid/random_generator.hpp>

#include <array>
#include <cerrno>
#include <cstdint>
#include <limits>

namespace corvane {

namespace {

/// The system's entropy, read ahead for a few identifiers: a system call for each would cost as much as making the rest
/// of its event. A child made by fork reads anew, so that it never repeats its parent's.
class Entropy {
  public:
    using result_type = std::uint64_t;
    static constexpr result_type min() { return 0; }
    static constexpr result_type max() { return std::numeric_limits<result_type>::max(); }

    result_type operator()() {
        if (used_ == words_.size() || read_.isInChild()) read();
        return words_[used_++];
    }

  private:
    void read() {
        if (getentropy(words_.data(), sizeof words_) != 0) throw SystemError("read entropy", errno);
        used_ = 0;
        read_ = ForkMark();
    }

    std::array<result_type, 32> words_{};  // as much as one call gives
    std::size_t used_ = words_.size();
    ForkMark read_;
};

thread_local Entropy entropy;

}  // namespace

std::string newUUID() {
    const boost::uuids::uuid uuid = boost::uuids::basic_random_generator<Entropy>(entropy)();
    constexpr char digits[] = "0123456789ABCDEF";
    std::string text(36, '-');
    char* out = text.data();
    for (std::size_t i = 0; i < uuid.size(); ++i) {
        if (i == 4 || i == 6 || i == 8 || i == 10) ++out;
        *out++ = digits[uuid.data[i] >> 4];
        *out++ = digits[uuid.data[i] & 0xF];
    }
    return text;
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
