#include <corvane/Agent/TransferSubmission.h>

#include <corvane/Agent/WireReader.h>
#include <corvane/Agent/WireWriter.h>
#include <corvane/Platform/UUID.h>

#include <zlib.h>

#include <algorithm>

namespace corvane {

namespace {
constexpr std::string_view magic = "CVTS";
constexpr std::int64_t version = 2;
// A power cut may leave zeros where a part of the file should be.
std::int64_t checksum(std::string_view bytes) {
    return static_cast<std::int64_t>(crc32_z(0, reinterpret_cast<const Bytef*>(bytes.data()), bytes.size()));
}
// Beyond it a sum with the time of day could overflow.
constexpr std::int64_t longestTime = std::int64_t{1000} * 60 * 60 * 24 * 365 * 100;
}  // namespace

std::string TransferSubmission::newToken() {
    const auto time = std::chrono::system_clock::now().time_since_epoch();
    auto rest = static_cast<std::uint64_t>(std::chrono::duration_cast<std::chrono::nanoseconds>(time).count());
    std::string token(16, '0');
    for (auto digit = token.rbegin(); digit != token.rend(); ++digit, rest >>= 4) {
        *digit = "0123456789ABCDEF"[rest & 0xF];
    }
    return token + '-' + newUUID().substr(17);
}

bool TransferSubmission::isToken(std::string_view text) noexcept {
    return text.size() == 36 && std::all_of(text.begin(), text.end(), [](char c) {
               return (c >= '0' && c <= '9') || (c >= 'A' && c <= 'F') || c == '-';
           });
}

bool TransferSubmission::wantsProgress() const noexcept {
    return std::none_of(extras.begin(), extras.end(), [](const auto& extra) {
        return extra.first == withoutProgress.first && extra.second == withoutProgress.second;
    });
}

std::string TransferSubmission::encoded() const {
    WireWriter write;
    write(magic, version, token, session, owner, description, request.url, request.method, request.headers, bodyPath);
    write(static_cast<std::int64_t>(limits.responseBody), std::int64_t{limits.timeWithoutProgress.count()},
          std::int64_t{limits.answer.count()}, std::int64_t{limits.transfersPerHost}, std::int64_t{patience.count()},
          wakeCommand);
    write(trustedCertificates, proxy.url, proxy.exceptions, extras);
    std::string bytes = write.take();
    WireWriter writeChecksum;
    writeChecksum(checksum(bytes));
    return bytes += writeChecksum.take();
}

void TransferSubmission::checkNames(std::string_view session, std::string_view owner,
                                    const std::vector<std::string>& wakeCommand) {
    const auto check = [](const char* what, std::size_t size, std::size_t most) {
        if (size > most) {
            throw FormatError(std::string(what) + " is longer than " + std::to_string(most) + " bytes");
        }
    };
    check("the session's identifier", session.size(), longestName);
    check("the owner key", owner.size(), longestName);
    std::size_t command = 0;
    for (const auto& argument : wakeCommand) command += argument.size() + sizeof(char*);
    check("the wake command", command, longestCommand);
}

TransferSubmission TransferSubmission::decode(std::string_view bytes) {
    if (bytes.size() > longest) throw FormatError("the submission is too long");
    WireReader read(bytes);
    std::string start;
    std::int64_t format = 0;
    read(start, format);
    if (start != magic) throw FormatError("the bytes are no submission");
    if (format < 1 || format > version) throw FormatError("the submission is of another version");
    TransferSubmission made;
    std::int64_t body = 0, progress = 0, answer = 0, perHost = 0, patience = 0;
    read(made.token, made.session, made.owner, made.description, made.request.url, made.request.method,
         made.request.headers, made.bodyPath, body, progress, answer, perHost, patience, made.wakeCommand);
    // Version 1 ends here. Earlier releases of this one have no checksum, and behind the last value there may be more.
    if (format == 1) read.finish();
    if (format > 1) read(made.trustedCertificates, made.proxy.url, made.proxy.exceptions, made.extras);
    if (format > 1 && read.rest() > 0) {
        const auto content = bytes.substr(0, bytes.size() - read.rest());
        std::int64_t stored = 0;
        read(stored);
        if (stored != checksum(content)) throw FormatError("the submission is damaged");
    }
    const bool inRange = body >= 0 && progress > 0 && progress <= longestTime && answer > 0 && answer <= longestTime &&
                         perHost > 0 && perHost <= 1000 && patience >= 0 && patience <= longestTime;
    if (!inRange || !isToken(made.token)) throw FormatError("a value of the submission is out of range");
    if (!made.bodyPath.starts_with('/') || made.bodyPath.find('\0') != std::string::npos) {
        throw FormatError("the path of the body is not absolute");
    }
    if (!made.trustedCertificates.empty() && !made.trustedCertificates.starts_with('/')) {
        throw FormatError("the path of the certificates is not absolute");
    }
    made.limits.responseBody = static_cast<std::size_t>(body);
    made.limits.timeWithoutProgress = std::chrono::milliseconds(progress);
    made.limits.answer = std::chrono::milliseconds(answer);
    made.limits.transfersPerHost = static_cast<int>(perHost);
    made.patience = std::chrono::milliseconds(patience);
    return made;
}

}  // namespace corvane
