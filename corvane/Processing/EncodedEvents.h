#pragma once

#include <corvane/Models/JSON.h>
#include <corvane/Store/GrowingBlob.h>

#include <cstddef>
#include <string>
#include <string_view>
#include <utility>

namespace corvane {

/// The event payloads of one batch, in order, in the two forms in which they are written: as JSON text for the
/// document, and as the blob of the backup row. Both grow with each event, and nothing written before is encoded again.
/// Not thread-safe; not changed any more once a document shares it.
class EncodedEvents {
  public:
    /// What the blob of a backup row begins and ends with.
    static constexpr std::string_view opening = R"({"events":[)";
    static constexpr std::string_view closing = "]}";

    EncodedEvents() = default;
    /// `count` payloads whose texts are joined with commas already, and have been found to be JSON.
    EncodedEvents(std::string text, std::size_t count) : count_(count), text_(std::move(text)) {}

    /// Adds an event's payload, a JSON object.
    void append(const JSON& payload);
    /// Adds all events of another batch.
    void append(const EncodedEvents& more);

    [[nodiscard]] std::size_t count() const { return count_; }
    /// The payloads' JSON texts, joined with commas.
    [[nodiscard]] const std::string& text() const { return text_; }
    /// `{"events":[...]}` in bytes. Takes in what was added since the last call.
    [[nodiscard]] const GrowingBlob& blob() const;

  private:
    void append(std::string_view texts, std::size_t count);

    std::size_t count_ = 0;
    std::string text_;
    mutable GrowingBlob blob_{opening, closing};
    mutable std::size_t inBlob_ = 0;  // how much of the text the blob has
};

}  // namespace corvane
