#include <corvane/Processing/EncodedEvents.h>

namespace corvane {

void EncodedEvents::append(const JSON& payload) {
    append(payload.text(), 1);
}

void EncodedEvents::append(const EncodedEvents& more) {
    if (more.count_ > 0) append(more.text_, more.count_);
}

void EncodedEvents::append(std::string_view texts, std::size_t count) {
    if (count_ > 0) text_ += ',';
    text_ += texts;
    count_ += count;
}

const GrowingBlob& EncodedEvents::blob() const {
    blob_.append(std::string_view(text_).substr(inBlob_));
    inBlob_ = text_.size();
    return blob_;
}

}  // namespace corvane
