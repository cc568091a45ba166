#include <corvane/Models/JSONShape.h>

#include <corvane/Models/JSONParser.h>

namespace corvane::jsonshape {

namespace {

constexpr int maximumDepth = 512;

// Counts what the parser reports; nothing is kept of it.
class Counter final : public JSONListener {
  public:
    void beginObject() override {
        if (depth_ == elements) ++objects_;
        ++depth_;
    }
    void endObject(std::size_t) override { --depth_; }
    void beginArray() override {
        beginOther();
        ++depth_;
    }
    void endArray(std::size_t) override { --depth_; }
    void key(std::string_view) override {
        if (depth_ == 1) ++keys_;
    }
    void string(std::string_view) override { beginOther(); }
    void integer(std::int64_t) override { beginOther(); }
    void unsignedInteger(std::uint64_t) override { beginOther(); }
    void number(double) override { beginOther(); }
    void boolean(bool) override { beginOther(); }
    void null() override { beginOther(); }

    [[nodiscard]] std::optional<std::size_t> objects() const {
        if (!isExact_ || keys_ != 1) return std::nullopt;
        return objects_;
    }

  private:
    static constexpr int elements = 2;  // the depth at which the array's elements stand

    void beginOther() {
        if (depth_ == elements) isExact_ = false;
    }

    int depth_ = 0;
    std::size_t keys_ = 0;  // of the outermost object
    std::size_t objects_ = 0;
    bool isExact_ = true;
};

}  // namespace

std::optional<std::size_t> objectsBetween(std::string_view text, std::string_view opening, std::string_view closing) {
    if (text.size() < opening.size() + closing.size() || !text.starts_with(opening) || !text.ends_with(closing)) {
        return std::nullopt;
    }
    Counter counter;
    if (!parseJSON(text, maximumDepth, counter)) return std::nullopt;
    return counter.objects();
}

}  // namespace corvane::jsonshape
