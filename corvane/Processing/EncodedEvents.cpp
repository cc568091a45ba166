#include <corvane/Processing/EncodedEvents.h>

namespace corvane {

void EncodedEvents::append(const JSON& payload) {
    if (count_ > 0) {
        text_ += ',';
        blob_.append(",");
    }
    text_ += payload.text();
    blob_.append(payload.text());
    ++count_;
}

}  // namespace corvane
