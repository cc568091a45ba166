#pragma once

#include <corvane/Export.h>
#include <corvane/Models/JSON.h>
#include <corvane/Store/GrowingBlob.h>

#include <cstddef>
#include <string>

namespace corvane {

/// The event payloads of one batch, in order, in the two forms in which they are written: as JSON text for the
/// document, and as the blob of the backup row. Both grow with each event, and nothing written before is encoded again.
/// Not thread-safe; not changed any more once a document shares it.
class CORVANE_EXPORT EncodedEvents {
  public:
    /// Adds an event's payload, a JSON object.
    void append(const JSON& payload);

    [[nodiscard]] std::size_t count() const { return count_; }
    /// The payloads' JSON texts, joined with commas.
    [[nodiscard]] const std::string& text() const { return text_; }
    /// `{"events":[...]}` in bytes.
    [[nodiscard]] const GrowingBlob& blob() const { return blob_; }

  private:
    std::size_t count_ = 0;
    std::string text_;
    GrowingBlob blob_{R"({"events":[)", "]}"};
};

}  // namespace corvane
