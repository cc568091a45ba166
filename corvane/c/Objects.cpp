#include <corvane/c/Objects.h>

#include <corvane/Platform/Mutex.h>
#include <corvane/c/Call.h>
#include <corvane/c/corvane.h>

#include <array>
#include <atomic>
#include <deque>
#include <iterator>
#include <new>

namespace corvane::c::objects {

namespace {

static_assert(sizeof(void*) == 8);

// A pointer, from its highest bit: a byte that no address has, the generation of the slot, its index, the kind, and a
// 1, which no aligned address ends with.
constexpr std::uint64_t mark = 0x43;
constexpr int markShift = 56, generationShift = 32, indexShift = 6, kindShift = 1;
constexpr std::uint64_t generations = std::uint64_t{1} << (markShift - generationShift);
constexpr std::uint64_t indices = std::uint64_t{1} << (generationShift - indexShift);
constexpr std::uint64_t kinds = std::uint64_t{1} << (indexShift - kindShift);

// A slot's state: its generation, its owners, the calls that use it.
constexpr int ownersShift = 20;
constexpr std::uint64_t oneUser = 1, oneOwner = std::uint64_t{1} << ownersShift;
constexpr std::uint64_t users(std::uint64_t state) {
    return state & (oneOwner - 1);
}
constexpr std::uint64_t owners(std::uint64_t state) {
    return (state >> ownersShift) & (oneOwner - 1);
}
constexpr std::uint64_t generationOf(std::uint64_t state) {
    return state >> (2 * ownersShift);
}
struct Slot {
    std::atomic<std::uint64_t> state = 0;
    std::unique_ptr<Object> object;
};

class Table {
  public:
    static Table& shared() {
        static Table& table = *new Table;  // it outlives everything that the process still does at its end
        return table;
    }

    [[nodiscard]] std::uint64_t take() {
        Lock lock(mutex_);
        if (!free_.empty()) {
            const std::uint64_t index = free_.front();
            free_.pop_front();
            return index;
        }
        const std::uint64_t chunk = used_ / chunkSize;
        if (chunk == chunks_.size()) throw std::bad_alloc();
        if (!chunks_[chunk].load(std::memory_order_relaxed)) chunks_[chunk] = new Slot[chunkSize];
        return used_++;
    }

    /// The slot at an index, or nullptr where there never was one.
    [[nodiscard]] Slot* find(std::uint64_t index) const noexcept {
        const std::uint64_t chunk = index / chunkSize;
        if (chunk >= chunks_.size()) return nullptr;
        Slot* slots = chunks_[chunk].load(std::memory_order_acquire);
        return slots ? &slots[index % chunkSize] : nullptr;
    }

    /// The object has neither owners nor users: nobody else comes to the slot any more.
    void empty(Slot& slot, std::uint64_t index) noexcept {
        const auto object = std::move(slot.object);  // what it does when it goes may come here again
        const std::uint64_t generation = (generationOf(slot.state) + 1) % generations;
        slot.state.store(generation << (2 * ownersShift), std::memory_order_release);
        Lock lock(mutex_);
        // Used again as late as can be. Without memory for that, it is not used again.
        try {
            free_.push_back(index);
        } catch (const std::bad_alloc&) {
        }
    }

  private:
    static constexpr std::uint64_t chunkSize = 4096;

    std::array<std::atomic<Slot*>, 1024> chunks_{};
    Mutex mutex_;
    std::uint64_t used_ CORVANE_GUARDED_BY(mutex_) = 0;
    std::deque<std::uint64_t> free_ CORVANE_GUARDED_BY(mutex_);
};

struct Name {
    explicit Name(const void* pointer) : bits(reinterpret_cast<std::uintptr_t>(pointer)) {}

    [[nodiscard]] bool isOne() const { return bits >> markShift == mark && (bits & 1) == 1; }
    [[nodiscard]] std::uint64_t generation() const { return (bits >> generationShift) % generations; }
    [[nodiscard]] std::uint64_t index() const { return (bits >> indexShift) % indices; }
    [[nodiscard]] Kind kind() const { return static_cast<Kind>((bits >> kindShift) % kinds); }

    const std::uint64_t bits;
};

/// The slot, with its state changed, or nullptr when nobody owns the object.
template <class Change>
Slot* changed(Name name, Change change, std::uint64_t* now = nullptr) noexcept {
    Slot* slot = name.isOne() ? Table::shared().find(name.index()) : nullptr;
    if (!slot) return nullptr;
    std::uint64_t state = slot->state.load(std::memory_order_acquire);
    while (generationOf(state) == name.generation() && owners(state) > 0) {
        const std::uint64_t next = change(state);
        if (slot->state.compare_exchange_weak(state, next, std::memory_order_acq_rel)) {
            if (now) *now = next;
            return slot;
        }
    }
    return nullptr;
}

const char* nameOf(Kind kind) {
    constexpr const char* names[] = {"",           "sessions",  "session access", "tracker",  "access",
                                     "event",      "value",     "delayed",        "observer", "snapshot",
                                     "evaluation", "processor", "text",           "task",     "headers"};
    const auto index = static_cast<std::size_t>(kind);
    return index < std::size(names) ? names[index] : "";
}

}  // namespace

void* add(Kind kind, std::unique_ptr<Object> object) {
    Table& table = Table::shared();
    const std::uint64_t index = table.take();
    Slot& slot = *table.find(index);
    slot.object = std::move(object);
    const std::uint64_t generation = generationOf(slot.state.fetch_add(oneOwner, std::memory_order_release));
    const std::uint64_t bits = mark << markShift | generation << generationShift | index << indexShift |
                               std::uint64_t{static_cast<std::uint8_t>(kind)} << kindShift | 1;
    return reinterpret_cast<void*>(static_cast<std::uintptr_t>(bits));  // NOLINT(performance-no-int-to-ptr)
}

Object& use(const void* pointer, Kind kind) {
    const auto expected = [kind] { return "corvane_" + std::string(nameOf(kind)); };
    if (!pointer) refuse(CORVANE_NO_OBJECT, "a null pointer stands where an object is needed: " + expected());
    const Name name(pointer);
    if (name.isOne() && name.kind() != kind) {
        refuse(CORVANE_WRONG_KIND, std::string("an object is of another kind: corvane_") + nameOf(name.kind()) +
                                       " where it is to be " + expected());
    }
    // A million calls at once are not to be had: the count does not overflow.
    const Slot* slot = changed(name, [](std::uint64_t state) { return state + oneUser; });
    if (!slot) refuse(CORVANE_RELEASED_OBJECT, "an object was released, or never was one: " + expected());
    return *slot->object;
}

void drop(const void* pointer) noexcept {
    const Name name(pointer);
    Slot& slot = *Table::shared().find(name.index());
    const std::uint64_t before = slot.state.fetch_sub(oneUser, std::memory_order_acq_rel);
    if (users(before) == 1 && owners(before) == 0) Table::shared().empty(slot, name.index());
}

bool retain(const void* pointer) noexcept {
    bool isKept = false;
    changed(Name(pointer), [&](std::uint64_t state) {
        isKept = owners(state) < oneOwner - 1;
        return isKept ? state + oneOwner : state;
    });
    return isKept;
}

bool release(const void* pointer) noexcept {
    const Name name(pointer);
    std::uint64_t now = 0;
    Slot* slot = changed(
        name, [](std::uint64_t state) { return state - oneOwner; }, &now);
    if (slot && owners(now) == 0 && users(now) == 0) Table::shared().empty(*slot, name.index());
    return slot;
}

}  // namespace corvane::c::objects
