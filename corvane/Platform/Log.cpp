#include <corvane/Platform/Log.h>

#include <corvane/Platform/JSONText.h>
#include <corvane/Platform/Mutex.h>

#include <spdlog/sinks/stdout_sinks.h>
#include <spdlog/spdlog.h>

#include <algorithm>
#include <utility>

namespace corvane {

namespace {

std::shared_ptr<spdlog::logger> makeLogger() {
    const std::string name(Log::subsystem);
    if (auto registered = spdlog::get(name)) return registered;
    auto logger = std::make_shared<spdlog::logger>(name, std::make_shared<spdlog::sinks::stderr_sink_mt>());
    logger->set_pattern("%Y-%m-%d %H:%M:%S.%e %l [%n:" + std::string(Log::category) + "] %v");
    logger->set_level(spdlog::level::trace);
    return logger;
}

spdlog::level::level_enum spdlogLevel(LogLevel level) {
    switch (level) {
        case LogLevel::debug:
            return spdlog::level::debug;
        case LogLevel::default_:
            return spdlog::level::info;
        case LogLevel::error:
            return spdlog::level::err;
    }
    return spdlog::level::err;
}

// Writes `format` with its placeholders replaced. A placeholder without an argument stays as it is
// written.
std::string render(std::string_view format, std::initializer_list<LogArgument> arguments, bool hidesPrivate) {
    struct Placeholder {
        std::string_view text;
        bool isPublic;
    };
    static constexpr Placeholder placeholders[] = {{"%{public}@", true}, {"%@", false}, {"%ld", true}, {"%d", true}};
    std::string out;
    out.reserve(format.size() + 64);
    const LogArgument* next = arguments.begin();
    while (!format.empty()) {
        const std::size_t percent = format.find('%');
        out.append(format.substr(0, percent));
        if (percent == std::string_view::npos) break;
        format.remove_prefix(percent);
        const Placeholder* found = nullptr;
        for (const auto& placeholder : placeholders) {
            if (format.starts_with(placeholder.text)) found = &placeholder;
        }
        if (!found || next == arguments.end()) {
            out += '%';
            format.remove_prefix(1);
            continue;
        }
        if (found->isPublic || !hidesPrivate) {
            next->appendTo(out);
        } else {
            out += "<private>";
        }
        ++next;
        format.remove_prefix(found->text.size());
    }
    return out;
}

void appendEscape(std::string& out, unsigned char c) {
    constexpr char digits[] = "0123456789abcdef";
    if (c == '\n' || c == '\t') {
        out.append(c == '\n' ? "\\n" : "\\t");
    } else {
        out.append("\\x").append(1, digits[c >> 4]).append(1, digits[c & 0xF]);
    }
}

// The length of the character that `text` begins with, or 0 when it is not to be printed.
std::size_t printableLength(std::string_view text, bool keepsLines) {
    const auto first = static_cast<unsigned char>(text.front());
    if (first < 0x80)
        return (first >= 0x20 && first != 0x7F) || (keepsLines && (first == '\n' || first == '\t')) ? 1 : 0;
    for (std::size_t length = 2; length <= 4 && length <= text.size(); ++length) {
        if (!jsontext::isUTF8(text.substr(0, length))) continue;
        const bool isControl = first == 0xC2 && static_cast<unsigned char>(text[1]) < 0xA0;
        return isControl ? 0 : length;
    }
    return 0;
}

}  // namespace

void LogArgument::appendTo(std::string& out) const {
    if (isNumber_) {
        out += std::to_string(number_);
        return;
    }
    for (auto rest = text_; !rest.empty();) {
        const std::size_t length = printableLength(rest, keepsLines_);
        if (length > 0) {
            out.append(rest.substr(0, length));
        } else {
            appendEscape(out, static_cast<unsigned char>(rest.front()));
        }
        rest.remove_prefix(std::max<std::size_t>(length, 1));
    }
}

struct Log::Output {
    Mutex mutex;
    std::shared_ptr<const Sink> sink CORVANE_GUARDED_BY(mutex);
    std::shared_ptr<spdlog::logger> logger CORVANE_GUARDED_BY(mutex);
};

Log::Log() : output_(new Output) {}

Log& Log::shared() {
    static auto& log = *new Log;
    return log;
}

void Log::setSink(Sink sink) {
    auto shared = sink ? std::make_shared<const Sink>(std::move(sink)) : nullptr;
    const Lock lock(output_->mutex);
    output_->sink.swap(shared);
}

void Log::write(LogLevel level, std::string_view format, std::initializer_list<LogArgument> arguments) noexcept {
    try {
        const std::string message = render(format, arguments, hidesPrivate_.load(std::memory_order_relaxed));
        std::shared_ptr<const Sink> sink;
        std::shared_ptr<spdlog::logger> logger;
        {
            const Lock lock(output_->mutex);
            sink = output_->sink;
            if (!sink && !output_->logger) output_->logger = makeLogger();
            logger = output_->logger;
        }
        if (sink) {
            (*sink)(level, message);
        } else {
            logger->log(spdlogLevel(level), spdlog::string_view_t(message.data(), message.size()));
        }
    } catch (...) {
        // A log that fails has nobody left to tell; the work that wanted to be logged goes on.
    }
}

}  // namespace corvane
