#include <corvane/Tracker/Sequence.h>

#include <corvane/Models/OwnJSON.h>

#include <boost/container/small_vector.hpp>

#include <algorithm>
#include <string>
#include <utility>

namespace corvane {

namespace {

JSON dictOf(const SequenceEntry& entry) {
    try {
        return entry.data.toDict();
    } catch (const EncodingError& error) {
        throw error.within(entry.name);
    }
}

bool isReplaced(const Sequence& sequence, std::size_t index) {
    const auto later = sequence.entries.begin() + static_cast<std::ptrdiff_t>(index) + 1;
    return std::any_of(later, sequence.entries.end(),
                       [&](const SequenceEntry& entry) { return entry.name == sequence.entries[index].name; });
}

}  // namespace

JSON encode(const Sequence& sequence) {
    boost::container::small_vector<JSON, 8> dicts;
    dicts.reserve(sequence.entries.size());
    std::size_t size = 2;
    for (const SequenceEntry& entry : sequence.entries) {
        dicts.push_back(dictOf(entry));
        size += entry.name.size() + dicts.back().text().size() + 4;
    }
    // The entries' texts were checked when they were made, so they are joined as they are.
    std::string text;
    text.reserve(size);
    text += '{';
    for (std::size_t i = 0; i < sequence.entries.size(); ++i) {
        const SequenceEntry& entry = sequence.entries[i];
        if (isReplaced(sequence, i)) continue;
        if (text.size() > 1) text += ',';
        if (!jsontext::appendString(text, entry.name)) throw EncodingError(EncodingError::notUTF8, "(property name)");
        text += ':';
        text += dicts[i].text();
    }
    text += '}';
    return OwnJSON::of(std::move(text));
}

}  // namespace corvane
