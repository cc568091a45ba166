#include <corvane/Platform/Bytes.h>

#include <openssl/evp.h>

#include <algorithm>
#include <array>
#include <cstring>

namespace corvane {

namespace {

constexpr std::array<char[2], 256> makeDigitPairs() {
    constexpr char digits[] = "0123456789abcdef";
    std::array<char[2], 256> pairs{};
    for (std::size_t byte = 0; byte < 256; ++byte) {
        pairs[byte][0] = digits[byte >> 4];
        pairs[byte][1] = digits[byte & 15];
    }
    return pairs;
}

constexpr auto digitPairs = makeDigitPairs();

}  // namespace

void appendHexDigits(std::string& out, std::string_view bytes) {
    const std::size_t start = out.size();
    const std::size_t end = start + 2 * bytes.size();
    // Room is doubled, as it is for append: resize alone may grow to the exact size, every time.
    if (out.capacity() < end) out.reserve(std::max(2 * out.capacity(), end));
    out.resize(end);
    char* to = out.data() + start;
    for (const char byte : bytes) {
        std::memcpy(to, digitPairs[static_cast<unsigned char>(byte)], 2);
        to += 2;
    }
}

std::string hexString(std::string_view bytes) {
    std::string digits;
    appendHexDigits(digits, bytes);
    return digits;
}

std::string base64String(std::string_view bytes) {
    std::string text((bytes.size() + 2) / 3 * 4 + 1, '\0');  // the encoder ends its text with a NUL
    const int length =
        EVP_EncodeBlock(reinterpret_cast<unsigned char*>(text.data()),
                        reinterpret_cast<const unsigned char*>(bytes.data()), static_cast<int>(bytes.size()));
    text.resize(static_cast<std::size_t>(length));
    return text;
}

bool holdsControlCharacter(std::string_view text) {
    return std::any_of(text.begin(), text.end(), [](unsigned char c) { return c < 0x20 || c == 0x7F; });
}

}  // namespace corvane
