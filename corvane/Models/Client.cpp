#include <corvane/Models/Client.h>

#include <corvane/Platform/Bytes.h>
#include <corvane/Platform/Error.h>
#include <corvane/Platform/Log.h>

#include <charconv>
#include <string_view>
#include <utility>

namespace corvane {

namespace {

void requirePrintable(std::string_view what, std::string_view text) {
    if (holdsControlCharacter(text)) {
        throw InvalidArgument("the client's " + std::string(what) + " holds a control character");
    }
}

std::int64_t buildNumber(std::string_view text) {
    text = text.substr(0, text.find('.'));
    std::int64_t number = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    return error == std::errc() && end == text.data() + text.size() ? number : 0;
}

}  // namespace

Client::Client(std::string identifier, std::string name, std::string version, std::int64_t build)
    : identifier_(std::move(identifier)), name_(std::move(name)), version_(std::move(version)), build_(build) {
    requirePrintable("identifier", identifier_);
    requirePrintable("name", name_);
    requirePrintable("version", version_);
}

std::optional<Client> Client::fromBundle(const Bundle& bundle) {
    auto identifier = bundle.entry(Bundle::identifierKey);
    auto name = bundle.entry(Bundle::nameKey);
    auto version = bundle.entry(Bundle::shortVersionKey);
    auto build = bundle.entry(Bundle::versionKey);
    if (!identifier || !name || !version || !build) {
        Log::shared().error("Failed to make a client from the bundle, an entry is missing");
        return std::nullopt;
    }
    try {
        return Client(*std::move(identifier), *std::move(name), *std::move(version), buildNumber(*build));
    } catch (const InvalidArgument& error) {
        Log::shared().error("Failed to make a client from the bundle, error=%{public}@", error.what());
        return std::nullopt;
    }
}

std::string Client::fullVersion() const {
    return version_ + "." + std::to_string(build_);
}

}  // namespace corvane
