#include <corvane/Tracker/Sequence.h>

#include <corvane/Models/OwnJSON.h>

#include <algorithm>
#include <string>
#include <utility>

namespace corvane {

namespace {

template <class Step>
decltype(auto) naming(const SequenceEntry& entry, Step&& step) {
    try {
        return step();
    } catch (const EncodingError& error) {
        throw error.within(entry.name);
    }
}

bool isReplaced(const Sequence& sequence, const SequenceEntry& entry) {
    return std::any_of(&entry + 1, sequence.entries.data() + sequence.entries.size(),
                       [&](const SequenceEntry& later) { return later.name == entry.name; });
}

/// Of an event that has two properties for its identity, both say the same.
class IdentityText {
  public:
    explicit IdentityText(const Sequence& sequence) : sequence_(sequence) {}

    void append(std::string& out) {
        if (length_ != 0) {
            out.append(out, at_, length_);
            return;
        }
        at_ = out.size();
        sequence_.identity->append(out, sequence_.submitTime);
        length_ = out.size() - at_;
    }

  private:
    const Sequence& sequence_;
    std::size_t at_ = 0;
    std::size_t length_ = 0;
};

}  // namespace

JSON encode(const Sequence& sequence) {
    // Encoding is the host's code: all of it runs before anything is written.
    boost::container::small_vector<const std::string*, 8> texts;
    std::size_t size = 2;
    for (const SequenceEntry& entry : sequence.entries) {
        texts.push_back(entry.data ? naming(entry, [&] { return &entry.data->dict().text(); }) : nullptr);
        size += entry.name.size() + 4 + (texts.back() ? texts.back()->size() : sequence.identity->size());
    }
    // The entries' texts were checked when they were made, so they are joined as they are.
    std::string text;
    text.reserve(size);
    text += '{';
    IdentityText identity(sequence);
    for (std::size_t i = 0; i < sequence.entries.size(); ++i) {
        const SequenceEntry& entry = sequence.entries[i];
        if (isReplaced(sequence, entry)) continue;
        if (text.size() > 1) text += ',';
        if (!jsontext::appendString(text, entry.name)) throw EncodingError(EncodingError::notUTF8, "(property name)");
        text += ':';
        if (texts[i]) {
            text += *texts[i];
        } else {
            naming(entry, [&] { identity.append(text); });
        }
    }
    text += '}';
    return OwnJSON::of(std::move(text));
}

}  // namespace corvane
