#include <corvane/Processing/UploadBatch.h>

#include <corvane/Platform/UUID.h>

#include <algorithm>
#include <iterator>
#include <utility>

namespace corvane {

namespace {

bool isFull(const EncodedEvents& events) {
    return events.count() >= UploadBatch::eventsOfPart || events.text().size() >= UploadBatch::bytesOfPart;
}

bool fit(const EncodedEvents& first, const EncodedEvents& second) {
    return first.count() + second.count() <= UploadBatch::eventsOfPart &&
           first.text().size() + second.text().size() < UploadBatch::bytesOfPart;
}

}  // namespace

void UploadBatch::append(const JSON& payload, const JSON& session) {
    if (count_ == 0) begin_ = Clock::now();
    const bool isNewPart = parts_.empty() || isFull(*parts_.back().events);
    if (isNewPart) {
        // A part is never empty, not even without memory: a document would have a gap.
        Part added{newUUID(), session, std::make_shared<EncodedEvents>()};
        added.events->append(payload);
        parts_.push_back(std::move(added));
    } else {
        Part& part = parts_.back();
        part.events->append(payload);
        part.session = session;
        part.isDue = true;
        part.isBackedUp = false;
    }
    ++count_;
    bytes_ += payload.text().size();
}

void UploadBatch::prepend(UploadBatch earlier) {
    if (!earlier.parts_.empty() && !parts_.empty() && !parts_.front().hasRow &&
        fit(*earlier.parts_.back().events, *parts_.front().events)) {
        Part& last = earlier.parts_.back();
        last.events->append(*parts_.front().events);
        last.session = std::move(parts_.front().session);
        last.isDue = true;
        last.isBackedUp = false;
        parts_.erase(parts_.begin());
    }
    earlier.parts_.insert(earlier.parts_.end(), std::make_move_iterator(parts_.begin()),
                          std::make_move_iterator(parts_.end()));
    parts_ = std::move(earlier.parts_);
    begin_ = earlier.begin_;
    count_ += earlier.count_;
    bytes_ += earlier.bytes_;
}

UploadBatch UploadBatch::take(const std::string& identifier) {
    UploadBatch taken;
    taken.begin_ = begin_;
    if (Part* const part = find(identifier)) {
        taken.count_ = part->events->count();
        taken.bytes_ = part->events->text().size();
        taken.parts_.push_back(std::move(*part));
        parts_.erase(parts_.begin() + (part - parts_.data()));
        count_ -= taken.count_;
        bytes_ -= std::min(bytes_, taken.bytes_);
    }
    return taken;
}

bool UploadBatch::isBackedUp() const {
    return std::all_of(parts_.begin(), parts_.end(), [](const Part& part) { return part.isBackedUp; });
}

UploadBatch::Part* UploadBatch::find(const std::string& identifier) {
    const auto found =
        std::find_if(parts_.begin(), parts_.end(), [&](const Part& part) { return part.identifier == identifier; });
    return found == parts_.end() ? nullptr : &*found;
}

}  // namespace corvane
