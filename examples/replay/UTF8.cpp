#include "UTF8.h"

#include <cstddef>

namespace replay {

namespace {

// What may follow a first byte: how many bytes, and the range of the first of them, which keeps out overlong forms,
// surrogates and everything above U+10FFFF.
struct Tail {
    std::size_t length;
    unsigned char least = 0x80;
    unsigned char most = 0xBF;
};

Tail tailAfter(unsigned char first) {
    if (first >= 0xC2 && first <= 0xDF) return {1};
    if (first == 0xE0) return {.length = 2, .least = 0xA0};
    if (first == 0xED) return {.length = 2, .most = 0x9F};
    if (first >= 0xE1 && first <= 0xEF) return {2};
    if (first == 0xF0) return {.length = 3, .least = 0x90};
    if (first == 0xF4) return {.length = 3, .most = 0x8F};
    if (first >= 0xF1 && first <= 0xF3) return {3};
    return {0};
}

}  // namespace

std::string repairedUTF8(std::string_view text) {
    constexpr std::string_view replacement = "\xEF\xBF\xBD";
    std::string repaired;
    repaired.reserve(text.size());
    for (std::size_t i = 0; i < text.size();) {
        const auto first = static_cast<unsigned char>(text[i]);
        const Tail tail = tailAfter(first);
        std::size_t length = 1;
        while (length <= tail.length && i + length < text.size()) {
            const auto next = static_cast<unsigned char>(text[i + length]);
            const bool fits = length == 1 ? next >= tail.least && next <= tail.most : (next & 0xC0) == 0x80;
            if (!fits) break;
            ++length;
        }
        const bool whole = first < 0x80 || (tail.length > 0 && length == tail.length + 1);
        repaired += whole ? text.substr(i, length) : replacement;
        i += length;
    }
    return repaired;
}

}  // namespace replay
