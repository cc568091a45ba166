#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace corvane {

/// Writes values one after the other: integers as 8 bytes, lowest first; flags as one byte; text and lists behind
/// their length. The counterpart of `WireReader`; what it writes outlives the process, so it never changes. Internal.
class WireWriter {
  public:
    void operator()(bool flag) { bytes_.push_back(flag ? '\1' : '\0'); }
    void operator()(std::int64_t number) {
        for (int shift = 0; shift < 64; shift += 8) {
            bytes_.push_back(static_cast<char>(static_cast<std::uint64_t>(number) >> shift));
        }
    }
    void operator()(std::string_view text) {
        size(text.size());
        bytes_.append(text);
    }
    void operator()(const std::string& text) { (*this)(std::string_view(text)); }
    template <class T>
    void operator()(const std::optional<T>& value) {
        (*this)(value.has_value());
        if (value) (*this)(*value);
    }
    template <class A, class B>
    void operator()(const std::pair<A, B>& pair) {
        (*this)(pair.first);
        (*this)(pair.second);
    }
    template <class T>
    void operator()(const std::vector<T>& list) {
        size(list.size());
        for (const auto& element : list) (*this)(element);
    }
    template <class K, class V>
    void operator()(const std::map<K, V>& map) {
        size(map.size());
        for (const auto& element : map) (*this)(element);
    }
    template <class A, class B, class... More>
    void operator()(const A& first, const B& second, const More&... more) {
        (*this)(first);
        (*this)(second, more...);
    }

    [[nodiscard]] std::string take() { return std::move(bytes_); }

  private:
    void size(std::size_t count) {
        for (int shift = 0; shift < 32; shift += 8) bytes_.push_back(static_cast<char>(count >> shift));
    }

    std::string bytes_;
};

}  // namespace corvane
