#pragma once

#include <corvane/Agent/FormatError.h>

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace corvane {

/// Reads back what `WireWriter` wrote. Throws `FormatError` on bytes that it cannot have written, and never takes
/// more memory than a small multiple of their number. Internal.
class WireReader {
  public:
    /// Reads from `bytes`, which must outlive the reader.
    explicit WireReader(std::string_view bytes) : bytes_(bytes) {}

    void operator()(bool& flag) {
        const char byte = take(1).front();
        if (byte != '\0' && byte != '\1') throw FormatError("a flag is neither set nor clear");
        flag = byte == '\1';
    }
    void operator()(std::int64_t& number) { number = static_cast<std::int64_t>(integer(8)); }
    void operator()(std::string& text) { text = take(size()); }
    template <class T>
    void operator()(std::optional<T>& value) {
        bool present = false;
        (*this)(present);
        value.reset();
        if (present) (*this)(value.emplace());
    }
    template <class A, class B>
    void operator()(std::pair<A, B>& pair) {
        (*this)(pair.first);
        (*this)(pair.second);
    }
    template <class T>
    void operator()(std::vector<T>& list) {
        list.clear();
        for (auto count = size(); count > 0; --count) (*this)(list.emplace_back());
    }
    template <class K, class V>
    void operator()(std::map<K, V>& map) {
        map.clear();
        for (auto count = size(); count > 0; --count) {
            std::pair<K, V> element;
            (*this)(element);
            map.insert(std::move(element));
        }
    }
    template <class A, class B, class... More>
    void operator()(A& first, B& second, More&... more) {
        (*this)(first);
        (*this)(second, more...);
    }

    /// Throws when something is left over, where nothing may be.
    void finish() const {
        if (!bytes_.empty()) throw FormatError("there are bytes behind the last value");
    }

    /// How many bytes are left.
    [[nodiscard]] std::size_t rest() const noexcept { return bytes_.size(); }

  private:
    std::string_view take(std::size_t count) {
        if (count > bytes_.size()) throw FormatError("a value is cut off");
        const auto taken = bytes_.substr(0, count);
        bytes_.remove_prefix(count);
        return taken;
    }
    std::uint64_t integer(std::size_t width) {
        std::uint64_t value = 0;
        int shift = 0;
        for (const char byte : take(width)) {
            value |= std::uint64_t{static_cast<unsigned char>(byte)} << shift;
            shift += 8;
        }
        return value;
    }
    // Every element takes a byte at least, so a count beyond what is left is a lie, and costs no memory.
    std::size_t size() {
        const auto count = static_cast<std::size_t>(integer(4));
        if (count > bytes_.size()) throw FormatError("a value is cut off");
        return count;
    }

    std::string_view bytes_;
};

}  // namespace corvane
