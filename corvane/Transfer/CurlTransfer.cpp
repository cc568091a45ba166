#include <corvane/Transfer/CurlTransfer.h>

#include <corvane/Transfer/HTTPURL.h>

#include <curl/curl.h>
#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <new>
#include <system_error>
#include <utility>

namespace corvane {

namespace {

using Code = TransferError::Code;

// More than any server has to say, and little enough to keep for every transfer.
constexpr std::size_t longestHead = std::size_t{256} * 1024;

thread_local bool dropsUnsent = false;

bool isToken(std::string_view text) {
    return !text.empty() && std::all_of(text.begin(), text.end(), [](char c) {
        return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') ||
               std::string_view("!#$%&'*+-.^_`|~").find(c) != std::string_view::npos;
    });
}

std::string_view trimmed(std::string_view text) {
    constexpr std::string_view blanks = " \t\r\n";
    const auto first = text.find_first_not_of(blanks);
    if (first == std::string_view::npos) return {};
    return text.substr(first, text.find_last_not_of(blanks) - first + 1);
}

}  // namespace

void CurlTransfer::EasyDeleter::operator()(void* easy) const noexcept {
    curl_easy_cleanup(easy);
}
void CurlTransfer::HeaderListDeleter::operator()(void* list) const noexcept {
    curl_slist_free_all(static_cast<curl_slist*>(list));
}

CurlTransfer::CurlTransfer(const HTTPTransfer& transfer)
    : limits_(transfer.limits),
      didSend_(transfer.didSend),
      deadline_(Clock::now() + limits_.timeWithoutProgress),
      easy_(curl_easy_init()) {
    if (!easy_) throw std::bad_alloc();
    if (transfer.bodyPath) openBody(*transfer.bodyPath, transfer.bodyMustBeOwn);
    setHeaders(transfer.request);
    setOptions(transfer);
}

CurlTransfer::~CurlTransfer() = default;

void CurlTransfer::openBody(const std::filesystem::path& file, bool mustBeOwn) {
    // Not to wait for the other end where somebody put a pipe in the file's place.
    const int flags = O_RDONLY | O_CLOEXEC | O_NONBLOCK | (mustBeOwn ? O_NOFOLLOW : 0);
    body_ = Descriptor(open(file.c_str(), flags));
    struct stat status {};
    std::string problem;
    if (!body_ || fstat(body_.get(), &status) != 0) {
        problem = std::system_category().message(errno);
    } else if (!S_ISREG(status.st_mode)) {
        problem = "it is not a file";
    } else if (mustBeOwn && status.st_uid != geteuid()) {
        problem = "it belongs to another user";
    }
    if (!problem.empty()) {
        throw TransferError(Code::bodyUnavailable, "cannot read " + file.string() + ": " + problem);
    }
    bodySize_ = status.st_size;
}

void CurlTransfer::setHeaders(const TransferRequest& request) {
    const auto append = [this](const std::string& line) {
        auto* list = curl_slist_append(static_cast<curl_slist*>(headerList_.get()), line.c_str());
        if (!list) throw std::bad_alloc();
        (void)headerList_.release();
        headerList_.reset(list);
    };
    for (const auto& [name, value] : request.headers) {
        if (!isToken(name) || value.find_first_of(std::string_view("\r\n\0", 3)) != std::string::npos) {
            throw TransferError(Code::invalidRequest, "the header cannot be sent: " + name);
        }
        append(trimmed(value).empty() ? name + ';' : name + ": " + value);
    }
    append("Expect:");
}

void CurlTransfer::setOptions(const HTTPTransfer& transfer) {
    CURL* easy = easy_.get();
    const HTTPURL url = HTTPURL::parse(transfer.request.url);
    curl_easy_setopt(easy, CURLOPT_URL, transfer.request.url.c_str());
    curl_easy_setopt(easy, CURLOPT_PROTOCOLS_STR, "http,https");
    curl_easy_setopt(easy, CURLOPT_FOLLOWLOCATION, 0L);
    curl_easy_setopt(easy, CURLOPT_SSL_VERIFYPEER, 1L);
    curl_easy_setopt(easy, CURLOPT_SSL_VERIFYHOST, 2L);
    curl_easy_setopt(easy, CURLOPT_NOSIGNAL, 1L);
    curl_easy_setopt(easy, CURLOPT_CLOSESOCKETFUNCTION, &closeSocket);
    // A name that is still being looked up must not hold up the thread when its transfer is dropped.
    curl_easy_setopt(easy, CURLOPT_QUICK_EXIT, 1L);
    curl_easy_setopt(easy, CURLOPT_CONNECTTIMEOUT_MS, static_cast<long>(limits_.timeWithoutProgress.count()));
    curl_easy_setopt(easy, CURLOPT_ERRORBUFFER, errorText_);
    curl_easy_setopt(easy, CURLOPT_SUPPRESS_CONNECT_HEADERS, 1L);
    setTrust(transfer.trustedCertificates);
    setProxy(transfer.proxy, url.isLoopback());

    curl_easy_setopt(easy, CURLOPT_HTTPHEADER, static_cast<curl_slist*>(headerList_.get()));
    curl_easy_setopt(easy, CURLOPT_HEADERFUNCTION, &headerArrived);
    curl_easy_setopt(easy, CURLOPT_HEADERDATA, this);
    curl_easy_setopt(easy, CURLOPT_WRITEFUNCTION, &bodyArrived);
    curl_easy_setopt(easy, CURLOPT_WRITEDATA, this);
    if (!transfer.bodyPath) return;

    if (!isToken(transfer.request.method)) throw TransferError(Code::invalidRequest, "the method cannot be sent");
    curl_easy_setopt(easy, CURLOPT_UPLOAD, 1L);
    curl_easy_setopt(easy, CURLOPT_CUSTOMREQUEST, transfer.request.method.c_str());
    curl_easy_setopt(easy, CURLOPT_INFILESIZE_LARGE, static_cast<curl_off_t>(bodySize_));
    curl_easy_setopt(easy, CURLOPT_READFUNCTION, &readBody);
    curl_easy_setopt(easy, CURLOPT_READDATA, this);
    curl_easy_setopt(easy, CURLOPT_SEEKFUNCTION, &seekBody);
    curl_easy_setopt(easy, CURLOPT_SEEKDATA, this);
}

// libcurl looks at both places, so the one that is not meant is cleared.
void CurlTransfer::setTrust(const std::filesystem::path& certificates) {
    if (certificates.empty()) return;
    std::error_code failed;
    const bool isDirectory = std::filesystem::is_directory(certificates, failed);
    const char* file = isDirectory ? nullptr : certificates.c_str();
    const char* directory = isDirectory ? certificates.c_str() : nullptr;
    for (const auto option : {CURLOPT_CAINFO, CURLOPT_PROXY_CAINFO}) curl_easy_setopt(easy_.get(), option, file);
    for (const auto option : {CURLOPT_CAPATH, CURLOPT_PROXY_CAPATH}) curl_easy_setopt(easy_.get(), option, directory);
    curl_easy_setopt(easy_.get(), CURLOPT_CA_CACHE_TIMEOUT, 0L);  // a file that is replaced counts from then on
}

// Both are set in any case: what is left out libcurl would look for in the environment.
void CurlTransfer::setProxy(const TransferProxy& proxy, bool isLoopback) {
    if (!isLoopback) proxy_ = proxy.url;
    curl_easy_setopt(easy_.get(), CURLOPT_PROXY, proxy_.c_str());
    curl_easy_setopt(easy_.get(), CURLOPT_NOPROXY, proxy.exceptions.c_str());
}

CurlTransfer::UnsentIsDropped::UnsentIsDropped() noexcept {
    dropsUnsent = true;
}
CurlTransfer::UnsentIsDropped::~UnsentIsDropped() {
    dropsUnsent = false;
}

// Of every connection, since a transfer may have one that another has made. Those that HTTP/2 transfers share stay
// open.
int CurlTransfer::closeSocket(void* /*self*/, int socket) noexcept {
    constexpr linger none{1, 0};
    if (dropsUnsent) setsockopt(socket, SOL_SOCKET, SO_LINGER, &none, sizeof none);
    return close(socket);
}

void CurlTransfer::update(Clock::time_point now) {
    CURL* easy = easy_.get();
    curl_off_t sent = 0, received = 0;
    long headers = 0, requests = 0;
    curl_easy_getinfo(easy, CURLINFO_SIZE_UPLOAD_T, &sent);
    curl_easy_getinfo(easy, CURLINFO_SIZE_DOWNLOAD_T, &received);
    curl_easy_getinfo(easy, CURLINFO_HEADER_SIZE, &headers);
    curl_easy_getinfo(easy, CURLINFO_REQUEST_SIZE, &requests);
    std::int64_t activity = sent + received + headers + requests;
    // The steps of connecting exchange bytes too, though nobody counts them.
    for (const auto step : {CURLINFO_NAMELOOKUP_TIME_T, CURLINFO_CONNECT_TIME_T, CURLINFO_APPCONNECT_TIME_T}) {
        curl_off_t reached = 0;
        curl_easy_getinfo(easy, step, &reached);
        activity += reached > 0;
    }
    if (activity != activity_) {
        activity_ = activity;
        deadline_ = now + limits_.timeWithoutProgress;
    }
    if (requests > 0 && sent >= bodySize_ && answerDeadline_ == Clock::time_point::max()) {
        answerDeadline_ = now + limits_.answer;
    }
    if (sent > reported_) {
        reported_ = sent;
        reportSent(sent);
    }
}

// Without memory for the report the transfer goes on; a later one says all.
void CurlTransfer::reportSent(std::int64_t sent) const noexcept {
    try {
        if (didSend_) didSend_(sent, bodySize_);
    } catch (...) {
    }
}

std::optional<AnyError> CurlTransfer::error(int curlCode) const {
    if (curlCode == CURLE_OK && isProxyRefusal()) {
        return AnyError(TransferError(Code::blocked, "the proxy wants to know who asks (407)"));
    }
    if ((curlCode == CURLE_OK || capReached_) && !headComplete_) {  // which is no failure to every libcurl
        return AnyError(TransferError(Code::network, "the connection ended inside the head of the answer"));
    }
    if (curlCode == CURLE_OK || capReached_) return std::nullopt;
    if (!bodyProblem_.empty()) return AnyError(TransferError(Code::bodyUnavailable, bodyProblem_));
    if (curlCode == CURLE_OPERATION_TIMEDOUT) return timeoutError();
    return AnyError(failure(curlCode));
}

// What libcurl calls the failure decides, and not how long connecting took: that is 0 on a connection that is used
// again.
TransferError CurlTransfer::failure(int curlCode) const {
    std::string text = curl_easy_strerror(static_cast<CURLcode>(curlCode));
    if (errorText_[0]) text += std::string(": ") + errorText_;
    for (auto at = std::string::npos; !proxy_.empty() && (at = text.find(proxy_)) != std::string::npos;) {
        text.replace(at, proxy_.size(), "(hidden)");  // it may hold a password
    }
    switch (curlCode) {
        case CURLE_COULDNT_RESOLVE_HOST:
        case CURLE_COULDNT_RESOLVE_PROXY:
        case CURLE_COULDNT_CONNECT:
            return {Code::unreachable, std::move(text)};
        case CURLE_PEER_FAILED_VERIFICATION:
        case CURLE_SSL_CONNECT_ERROR:
        case CURLE_SSL_CACERT_BADFILE:
        case CURLE_SSL_ISSUER_ERROR:
        case CURLE_SSL_INVALIDCERTSTATUS:
        case CURLE_PROXY:
            return {Code::blocked, std::move(text)};
        default:
            // Between the connection and the request there is the proxy's word, where there is a proxy.
            return {proxy_.empty() || hasBegun() ? Code::network : Code::blocked, std::move(text)};
    }
}

// The document's own exchange, behind name, connection, handshake and the way through a proxy.
bool CurlTransfer::hasBegun() const {
    curl_off_t reached = 0;
    curl_easy_getinfo(easy_.get(), CURLINFO_PRETRANSFER_TIME_T, &reached);
    return reached > 0;
}

// Through a proxy without a tunnel its answer looks like the server's, but for this one, which no server gives.
bool CurlTransfer::isProxyRefusal() const {
    constexpr int authenticationRequired = 407;
    return !proxy_.empty() && headComplete_ && answer_.statusCode == authenticationRequired &&
           spellings_.contains("proxy-authenticate");
}

std::optional<AnyError> CurlTransfer::timeoutError() const {
    if (answerDeadline_ < deadline_) {
        if (headComplete_) return std::nullopt;
        return AnyError(
            TransferError(Code::timedOut, "no answer came within " + std::to_string(limits_.answer.count()) + " ms"));
    }
    const std::string time = std::to_string(limits_.timeWithoutProgress.count()) + " ms";
    if (!hasBegun()) return AnyError(TransferError(Code::unreachable, "no connection was made for " + time));
    return AnyError(TransferError(Code::timedOut, "nothing was sent or received for " + time));
}

std::optional<TransferResponse> CurlTransfer::response() const {
    if (!headComplete_) return std::nullopt;
    return answer_;
}

void CurlTransfer::takeHeader(std::string_view line) {
    if (line.starts_with("HTTP/")) {  // also after an interim answer
        answer_ = {};
        spellings_.clear();
        headComplete_ = false;
    } else if (headComplete_) {
        return;                                                     // a trailer
    } else if (line.starts_with('\r') || line.starts_with('\n')) {  // the end for libcurl, whatever else is there
        long status = 0;
        curl_easy_getinfo(easy_.get(), CURLINFO_RESPONSE_CODE, &status);
        answer_.statusCode = status;
        headComplete_ = status >= 200;
    } else if (const auto colon = line.find(':'); colon != std::string_view::npos) {
        const std::string name(line.substr(0, colon));
        const auto value = trimmed(line.substr(colon + 1));
        // Looked up, and not searched for: a head of many fields must not keep the thread from everything else.
        const auto [known, isNew] = spellings_.try_emplace(inLowerCase(name), name);
        std::string& values = answer_.headers[known->second];
        if (!isNew) values.append(", ");
        values.append(value);
    }
}

std::size_t CurlTransfer::readBody(char* buffer, std::size_t size, std::size_t count, void* self) noexcept {
    auto& transfer = *static_cast<CurlTransfer*>(self);
    const auto wanted =
        std::min<std::int64_t>(static_cast<std::int64_t>(size * count), transfer.bodySize_ - transfer.bodyRead_);
    if (wanted <= 0) return 0;  // what was added to the file meanwhile is not part of the body
    ssize_t got = 0;
    do {
        got = pread(transfer.body_.get(), buffer, static_cast<std::size_t>(wanted), transfer.bodyRead_);
    } while (got < 0 && errno == EINTR);
    if (got <= 0) {
        transfer.bodyProblem_ = got < 0 ? "cannot read the body file: " + std::system_category().message(errno)
                                        : "the body file has shrunk";
        return CURL_READFUNC_ABORT;
    }
    transfer.bodyRead_ += got;
    return static_cast<std::size_t>(got);
}

int CurlTransfer::seekBody(void* self, std::int64_t offset, int origin) noexcept {
    if (origin != SEEK_SET || offset < 0) return CURL_SEEKFUNC_CANTSEEK;
    static_cast<CurlTransfer*>(self)->bodyRead_ = offset;
    return CURL_SEEKFUNC_OK;
}

std::size_t CurlTransfer::headerArrived(char* data, std::size_t size, std::size_t count, void* self) noexcept {
    auto& transfer = *static_cast<CurlTransfer*>(self);
    const std::size_t length = size * count;
    transfer.headerBytes_ += length;
    if (transfer.headerBytes_ > longestHead) return 0;
    try {
        transfer.takeHeader({data, length});
    } catch (...) {
        return 0;  // out of memory: the transfer fails
    }
    return length;
}

std::size_t CurlTransfer::bodyArrived(char*, std::size_t size, std::size_t count, void* self) noexcept {
    auto& transfer = *static_cast<CurlTransfer*>(self);
    transfer.answerBytes_ += size * count;
    if (transfer.answerBytes_ <= transfer.limits_.responseBody) return size * count;
    transfer.capReached_ = true;
    return 0;
}

}  // namespace corvane
