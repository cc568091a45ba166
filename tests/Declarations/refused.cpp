// What the compiler must refuse, each with one error that shows the line here, says the words after "refused:", and
// names what follows after the arrow: the field, or the type where it is the type's fault. See check.
#include <corvane/corvane.h>

#include <filesystem>
#include <map>
#include <memory>
#include <span>
#include <string>
#include <tuple>
#include <unordered_map>
#include <vector>

namespace lib {
enum class Quality { low, high };
}
std::string_view toText(lib::Quality quality) {
    return quality == lib::Quality::high ? "high" : "low";
}

using namespace corvane;

enum class Plan { free };
std::wstring toText(Plan) {
    return L"free";
}

struct Plain {
    int number = 0;
};
template <class T>
struct With {
    int good;
    T bad;
};
template <class T>
struct Within {
    std::map<std::string, std::vector<With<std::optional<T>>>> nested;
    std::vector<Within> children;
};

struct Referring {
    int good;
    const std::string& bad;
};
struct Packed {
    int good;
    int bad : 3;
};
struct Anonymous {
    int good;
    union {
        int bad;
        float worse;
    };
};
union Either {
    int number;
    float real;
};
struct Derived : Plain {
    int good;
};
struct Fixed {
    int good;
    char bad[40];
    std::string text;
    int worse[2][3];
};
struct Twice {
    int a = 0, b = 0;
    static constexpr auto corvaneFields() { return std::tuple{Field{"bad", &Twice::a}, Field{"bad", &Twice::b}}; }
};
struct Careless {
    int good;
    void encode(Encoder& encoder) { encoder.integer(good); }
};
struct Other {
    int good;
    std::string toDict() const { return "{}"; }
};
class Closed {
    int hidden = 0;
};

struct ViewEvent {
    EventProperty<EventData> event = required;
    EventProperty<With<std::optional<const char*>>> property = required;
};
struct DerivedEvent : ViewEvent {};
struct Unmade {
    explicit Unmade(int) {}
    static constexpr auto corvaneFields() { return std::tuple{}; }
};

void refuse(const std::shared_ptr<Tracker>& tracker, SessionManager& sessions, AccessTracker& access,
            AccessSessionManager& session, Encoder& encoder) {
    const std::string text;
    tracker->push(With<std::string_view>());                  // refused: view or a pointer -> "bad"
    tracker->push(Within<std::string_view>());                // refused: view or a pointer -> "bad"
    access.push(With<const char*>());                         // refused: view or a pointer -> "bad"
    sessions.push(SessionData{"k", With<std::span<int>>()});  // refused: view or a pointer -> "bad"
    session.push(SessionData{"k", With<std::span<long>>()});  // refused: view or a pointer -> "bad"
    tracker->push(With<std::map<std::string_view, int>>());   // refused: view or a pointer -> "bad"
    tracker->push(With<Plain*>());                            // refused: is a pointer -> "bad"
    encode(encoder, With<std::shared_ptr<Plain>>());          // refused: cannot be encoded -> "bad"
    tracker->push(Referring{1, text});                        // refused: a reference -> Referring
    tracker->push(Packed());                                  // refused: a bit-field -> Packed
    tracker->push(Anonymous());                               // refused: a union -> Anonymous
    tracker->push(With<Either>());                            // refused: a union -> "bad"
    tracker->push(With<Derived>());                           // refused: a base class -> Derived
    tracker->push(Fixed());                                   // refused: an array -> "bad"
    tracker->push(With<std::u16string>());                    // refused: wide characters -> "bad"
    tracker->push(With<std::vector<char>>());                 // refused: single characters -> "bad"
    tracker->push(With<std::multimap<std::string, int>>());   // refused: hold a key twice -> "bad"
    tracker->push(With<std::unordered_map<int, int>>());      // refused: keys are not text -> "bad"
    tracker->push(Twice());                                   // refused: spells this field twice -> "bad"
    tracker->push(With<std::filesystem::path>());             // refused: hold its .string() -> "bad"
    tracker->push(With<Careless>());                          // refused: must be const -> "bad"
    (void)toDict(Other());                                    // refused: return a corvane::JSON -> Other
    tracker->push(With<lib::Quality>());                      // refused: stands in another namespace -> "bad"
    tracker->push(With<Plan>());                              // refused: converts to a std::string_view -> "bad"
    tracker->push(With<__int128>());                          // refused: more than 64 bits -> "bad"
    tracker->push(Closed());                                  // refused: cannot be encoded -> Closed
    tracker->push(7);                                         // refused: only a data event -> int
    tracker->submit<ViewEvent>();                             // refused: view or a pointer -> "bad"
    access.submit<DerivedEvent>();                            // refused: a base class -> DerivedEvent
    tracker->time<Unmade>();                                  // refused: no event type -> Unmade
}
