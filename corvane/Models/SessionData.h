#pragma once

#include <corvane/Export.h>
#include <corvane/Models/DataEvent.h>

#include <string>

namespace corvane {

/// A data event under the key by which a session carries it: `SessionData{"viewer", viewer}`.
template <class D>
struct SessionData {
    std::string key;
    D data;

    /// One entry: the key with the data event's object.
    [[nodiscard]] CORVANE_LOCAL JSON toDict() const {
        const JSON dict = dataDict();
        Encoder encoder;
        encoder.beginObject();
        encoder.key(key);
        encoder.json(dict);
        encoder.endObject();
        return std::move(encoder).takeJSON();
    }

  private:
    [[nodiscard]] CORVANE_LOCAL JSON dataDict() const {
        try {
            return detail::dictOf(data);
        } catch (const EncodingError& error) {
            throw error.within(key);
        }
    }
};

template <class D>
SessionData(std::string, D) -> SessionData<D>;

template <class D>
struct detail::Contents<SessionData<D>> {
    using Type = D;
};

}  // namespace corvane
