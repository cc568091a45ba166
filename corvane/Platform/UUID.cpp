#include <corvane/Platform/UUID.h>

#include <boost/uuid/random_generator.hpp>

namespace corvane {

std::string newUUID() {
    // The generator reads the system's entropy for every identifier, so a forked child never
    // repeats its parent's.
    const boost::uuids::uuid uuid = boost::uuids::random_generator()();
    constexpr char digits[] = "0123456789ABCDEF";
    std::string text;
    text.reserve(36);
    for (std::size_t i = 0; i < uuid.size(); ++i) {
        if (i == 4 || i == 6 || i == 8 || i == 10) text += '-';
        text += digits[uuid.data[i] >> 4];
        text += digits[uuid.data[i] & 0xF];
    }
    return text;
}

}  // namespace corvane
