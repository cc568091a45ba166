#include <corvane/Upload/UploadService.h>

#include <corvane/Agent/Host/DefaultTransferSession.h>
#include <corvane/Platform/Bundle.h>
#include <corvane/Platform/Bytes.h>
#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Platform/HostCall.h>
#include <corvane/Platform/JSONText.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/MainQueue.h>
#include <corvane/Platform/PrivateFile.h>
#include <corvane/Platform/Require.h>
#include <corvane/Transfer/HTTPURL.h>
#include <corvane/Transfer/TransferError.h>
#include <corvane/Upload/PreparedUploadRequest.h>
#include <corvane/Upload/RetryAfter.h>
#include <corvane/Upload/UploadServiceDelegate.h>

#include <algorithm>
#include <set>
#include <utility>

namespace corvane {

namespace {

constexpr const char* unknown = "unknown";

// Text that stays in its header whatever it says.
std::string headerText(std::string text) {
    std::replace_if(
        text.begin(), text.end(), [](char c) { return c == '\r' || c == '\n' || c == '\0'; }, ' ');
    return text;
}

using jsontext::isUTF8;

bool isTokenCharacter(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') ||
           std::string_view("!#$%&'*+-.^_`|~").find(c) != std::string_view::npos;
}

// Why a host's header is not sent; nothing when it is.
std::string_view problemOf(const std::pair<std::string, std::string>& header) {
    const auto& [name, value] = header;
    if (name.empty() || !std::all_of(name.begin(), name.end(), isTokenCharacter)) return "the name is none";
    if (holdsControlCharacter(value)) return "the value holds a control character";
    constexpr std::string_view taken[] = {"content-type",
                                          "user-agent",
                                          "content-encoding",
                                          "x-veskar-actionsignature",
                                          "content-length",
                                          "transfer-encoding",
                                          "host",
                                          "connection",
                                          "expect"};
    std::string lower = name;
    std::transform(lower.begin(), lower.end(), lower.begin(),
                   [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; });
    return std::find(std::begin(taken), std::end(taken), lower) == std::end(taken) ? "" : "the library sends its own";
}

std::set<std::string> identifiersOfRunning(const std::vector<std::shared_ptr<TransferTask>>& tasks) {
    std::set<std::string> identifiers;
    for (const auto& task : tasks) {
        if (task->state() != TransferTask::State::running) continue;
        if (auto identifier = task->description()) identifiers.insert(*std::move(identifier));
    }
    return identifiers;
}

DeliveryUpdate::Cause causeOf(const AnyError& error, const std::optional<TransferResponse>& response) {
    using Reason = DeliveryUpdate::Reason;
    const auto* known = error.as<TransferError>();
    const auto code = known ? known->value() : TransferError::Code::network;
    const Reason reason = code == TransferError::Code::unreachable ? Reason::unreachable
                          : code == TransferError::Code::blocked   ? Reason::blocked
                          : code == TransferError::Code::cancelled ? Reason::cancelled
                                                                   : Reason::failed;
    const bool isAnswered = response && response->isHTTP;
    return {reason, isAnswered ? std::optional(response->statusCode) : std::nullopt, error.what()};
}

bool isGone(const std::filesystem::path& file) {
    std::error_code failed;
    return !std::filesystem::exists(file, failed) && !failed;
}

UploadResponse uploadResponse(const TransferResponse& response) {
    UploadResponse made{response.statusCode, response.headers};
    const bool readable = std::all_of(made.headers.begin(), made.headers.end(),
                                      [](const auto& header) { return isUTF8(header.first) && isUTF8(header.second); });
    if (!readable) made.headers.clear();
    return made;
}

}  // namespace

UploadService::Verdict UploadService::classify(std::int64_t statusCode) noexcept {
    if (statusCode >= 200 && statusCode <= 299) return Verdict::delivered;
    if (statusCode == 401) return Verdict::unauthorized;
    if (statusCode == 429 || statusCode >= 500) return Verdict::unavailable;
    if (statusCode >= 400) return Verdict::refused;
    return Verdict::unhandled;
}

std::string UploadService::ownerKey(const Endpoint& endpoint) {
    std::string application = Bundle::main().entry(Bundle::identifierKey).value_or("");
    if (application.empty()) application = executablePath().filename().string();
    std::string documents;
    try {
        documents = DocumentsDirectory::path().string();
    } catch (const Error&) {  // without a directory there is nothing to tell apart by it
    }
    return application + '\n' + documents + '\n' + DocumentsDirectory::fileNamePart(endpoint.name());
}

UploadService::UploadService(Endpoint endpoint, std::shared_ptr<SignerType> signer, TransferSession::Factory factory)
    : endpoint_(endpoint),
      signer_(std::move(signer)),
      factory_(factory ? std::move(factory) : &makeDefaultTransferSession),
      lazyURLSession_([this] { return openSession(); }) {
    if (!signer_) throw InvalidArgument("an upload service needs a signer");
}

UploadService::~UploadService() {
    if (backgroundCompletions_.empty()) return;
    MainQueue::async([completions = std::move(backgroundCompletions_)] { invoke(completions); });
}

void UploadService::setDelegate(std::weak_ptr<UploadServiceDelegate> delegate) {
    const Lock lock(mutex_);
    delegate_ = std::move(delegate);
}

void UploadService::registerAccessQueue(std::shared_ptr<SerialQueue> queue) {
    const Lock lock(mutex_);
    accessQueue_ = std::move(queue);
}

std::shared_ptr<TransferSession> UploadService::openSession() {
    const std::string identifier(sessionIdentifier);
    Log::shared().default_("Upload session configuration will be created, identifier=%{public}@", identifier);
    TransferSessionConfiguration configuration;
    configuration.identifier = identifier;
    configuration.ownerKey = ownerKey(endpoint_);
    configuration.relaunchesForEvents = true;
    configuration.discretionary = true;
    configuration.sharedContainerIdentifier = endpoint_.sharedContainerIdentifier();
    configuration.trustedCertificates = endpoint_.trustedCertificates();
    std::shared_ptr<SerialQueue> queue;
    {
        const Lock lock(mutex_);
        queue = accessQueue_;
    }
    CORVANE_REQUIRE(!weak_from_this().expired(), "an upload service must be made with std::make_shared");
    auto opened = factory_(std::move(configuration), weak_from_this(), std::move(queue));
    if (!opened) throw InvalidArgument("the transfer session factory returned nothing");
    opened->setDescription(identifier);
    Log::shared().default_("Upload session configuration has been created, identifier=%{public}@", identifier);
    return opened;
}

// The session, or nothing when it could not be opened.
std::shared_ptr<TransferSession> UploadService::session() noexcept {
    try {
        return lazyURLSession_.value();
    } catch (...) {
        Log::shared().error("Upload session could not be created, error=%{public}@", AnyError::current().what());
        return nullptr;
    }
}

void UploadService::submit(const PreparedUploadRequest& request) {
    if (const auto opened = session()) startTask(*opened, request);
}

void UploadService::startTask(TransferSession& session, const PreparedUploadRequest& request) {
    const std::string signatureText = signature(request.dataFileURL);
    HTTPHeaders headers{{"Content-Type", headerText(request.contentType)},
                        {"User-Agent", headerText(request.userAgent)},
                        {"Content-Encoding", "gzip"},
                        {"X-Veskar-ActionSignature", signatureText}};
    appendHostHeaders(headers);
    const auto task = session.uploadTask({.url = endpoint_.url(), .method = "PUT", .headers = std::move(headers)},
                                         request.dataFileURL);
    task->setDescription(request.identifier);
    task->resume();
    if (!Log::shared().isEnabled(LogLevel::default_)) return;  // the text of its values takes longer than the rest
    Log::shared().default_("Upload task submitted, identifier=%{public}@, urlSessionTaskID=%{public}@, signature=%@",
                           request.identifier, urlSessionTaskID(*task), signatureText);
}

// Their values are the host's secrets, so a line in the log names the header alone.
void UploadService::appendHostHeaders(HTTPHeaders& headers) const {
    HTTPHeaders added;
    if (const auto asked = endpoint_.headers()) callHost("endpoint headers", [&] { added = asked(); });
    for (auto& header : added) {
        const auto problem = problemOf(header);
        if (problem.empty()) {
            headers.push_back(std::move(header));
        } else {
            Log::shared().error("Header of the endpoint is not sent, name=%{public}@, reason=%{public}@", header.first,
                                problem);
        }
    }
}

std::string UploadService::signature(const std::filesystem::path& file) {
    try {
        return headerText(signer_->sign(readWholeFile(file)));
    } catch (...) {
        return headerText("SigningFailure=" + std::string(AnyError::current().what()));
    }
}

void UploadService::resubmit(std::vector<PreparedUploadRequest> requests) {
    if (requests.empty()) return;
    {
        const Lock lock(mutex_);  // before the session is opened: its first words may be completions
        ++pendingListings_;
    }
    const auto opened = session();
    if (!opened) {
        const Lock lock(mutex_);
        --pendingListings_;
        return;
    }
    opened->tasks([weak = weak_from_this(), requests = std::move(requests)](const auto& tasks) {
        if (const auto service = weak.lock()) service->startMissing(requests, tasks);
    });
}

void UploadService::inFlight(std::function<void(const std::set<std::string>&)> answer) {
    if (const auto opened = session()) {
        opened->tasks([answer = std::move(answer)](const auto& tasks) { answer(identifiersOfRunning(tasks)); });
    }
}

void UploadService::cancel(std::set<std::string> identifiers,
                           std::function<void(const std::set<std::string>&)> answer) {
    const auto opened = session();
    if (!opened) return;
    opened->tasks([identifiers = std::move(identifiers), answer = std::move(answer)](const auto& tasks) {
        auto notRunning = identifiers;
        for (const auto& task : tasks) {
            const auto identifier = task->description().value_or(unknown);
            if (task->state() == TransferTask::State::completed || !identifiers.contains(identifier)) continue;
            notRunning.erase(identifier);
            task->cancel();
        }
        answer(notRunning);
    });
}

void UploadService::startMissing(const std::vector<PreparedUploadRequest>& requests,
                                 const std::vector<std::shared_ptr<TransferTask>>& tasks) {
    const auto inFlight = identifiersOfRunning(tasks);
    std::set<std::string> ended;
    {
        const Lock lock(mutex_);
        ended = endedMeanwhile_;
        if (--pendingListings_ == 0) endedMeanwhile_.clear();
    }
    for (const auto& request : requests) {
        Log::shared().default_("Attempting resubmission of request, identifier=%{public}@", request.identifier);
        if (inFlight.contains(request.identifier)) {
            Log::shared().default_("Resubmission of request cancelled. Already in flight, identifier=%{public}@",
                                   request.identifier);
        } else if (ended.contains(request.identifier) && isGone(request.dataFileURL)) {
            Log::shared().default_("Resubmission of request cancelled. Ended meanwhile, identifier=%{public}@",
                                   request.identifier);
        } else {
            submit(request);
        }
    }
}

void UploadService::taskDidSendBodyData(const TransferTask& task, std::int64_t sent, std::int64_t total,
                                        std::int64_t expected) {
    const std::string identifier = task.description().value_or(unknown);
    if (const auto told = delegate()) told->uploadDidSend(identifier, total, expected);
    if (!logsProgress()) return;
    Log::shared().default_(
        "Upload sent data, identifier=%{public}@, urlSessionTaskID=%{public}@, sent=%@, total=%@, expected=%@",
        identifier, urlSessionTaskID(task), std::to_string(sent), std::to_string(total), std::to_string(expected));
}

void UploadService::taskDidComplete(const TransferTask& task, const std::optional<AnyError>& error,
                                    const std::optional<TransferResponse>& response) {
    const UploadResult ending = result(task, error, response);
    if (const auto delegate = noteEnd(task)) delegate->uploadService(*this, ending);
}

void UploadService::tasksDidComplete(const std::vector<Completion>& completions) {
    std::shared_ptr<UploadServiceDelegate> delegate;
    std::vector<UploadResult> results;
    for (const auto& [task, outcome] : completions) {
        results.push_back(result(task, outcome.get().error, outcome.get().response));
        delegate = noteEnd(task);
    }
    if (delegate) delegate->uploadServiceTogether(*this, results);
}

void UploadService::taskDidEndElsewhere(const TransferTask& task, const std::optional<AnyError>& error,
                                        const std::optional<TransferResponse>& response) {
    const UploadResult ending = result(task, error, response);
    if (const auto delegate = noteEnd(task)) delegate->uploadEndedElsewhere(ending);
}

// An upload of another server's is an earlier run's, whose endpoint had another URL.
void UploadService::serverIsHeldUp(const std::string& server, bool lasts) {
    if (server != HTTPURL::parse(endpoint_.url()).server()) return;
    if (const auto told = delegate()) told->uploadsAreHeldUp(lasts);
}

std::shared_ptr<const std::atomic<bool>> UploadService::progressIsWanted() const noexcept {
    const auto told = delegate();
    return told ? told->progressIsWanted() : nullptr;
}

std::shared_ptr<UploadServiceDelegate> UploadService::delegate() const {
    const Lock lock(mutex_);
    return delegate_.lock();
}

std::shared_ptr<UploadServiceDelegate> UploadService::noteEnd(const TransferTask& task) {
    const Lock lock(mutex_);
    if (pendingListings_ > 0) endedMeanwhile_.insert(task.description().value_or(unknown));
    return delegate_.lock();
}

UploadResult UploadService::result(const TransferTask& task, const std::optional<AnyError>& error,
                                   const std::optional<TransferResponse>& response) {
    const std::string identifier = task.description().value_or(unknown);
    const std::string taskID = urlSessionTaskID(task);
    if (error) {
        Log::shared().error("Upload failed, identifier=%{public}@, urlSessionTaskID=%{public}@, error=%{public}@",
                            identifier, taskID, error->what());
        auto cause = causeOf(*error, response);
        // A captive portal in the way would use up a document's attempts in a few starts, and nothing of it was sent.
        const bool isCounted =
            cause.reason != DeliveryUpdate::Reason::blocked && cause.reason != DeliveryUpdate::Reason::cancelled;
        return UploadResult::retry(identifier, now(), isCounted, std::move(cause));
    }
    if (!response || !response->isHTTP) {
        Log::shared().default_("Upload unknown state, identifier=%{public}@, urlSessionTaskID=%{public}@", identifier,
                               taskID);
        return UploadResult::retry(identifier, now(), true,
                                   {.reason = DeliveryUpdate::Reason::failed, .problem = "the answer is none of HTTP"});
    }
    return result(identifier, taskID, uploadResponse(*response));
}

UploadResult UploadService::result(const std::string& identifier, const std::string& taskID, UploadResponse response) {
    auto& log = Log::shared();
    const auto status = response.statusCode;
    const auto text = log.isEnabled(LogLevel::default_) ? response.description() : std::string();
    const DeliveryUpdate::Cause answer{.reason = DeliveryUpdate::Reason::answer, .status = status};
    switch (classify(status)) {
        case Verdict::delivered:
            log.default_(
                "Upload completed successfully, identifier=%{public}@, urlSessionTaskID=%{public}@, status=%ld, "
                "uploadResponse=%@",
                identifier, taskID, status, text);
            return UploadResult::success(identifier, std::move(response));
        case Verdict::unauthorized:
            log.default_(
                "Upload HTTP failed authorization, and will retry, identifier=%{public}@, "
                "urlSessionTaskID=%{public}@, status=%ld, uploadResponse=%@",
                identifier, taskID, status, text);
            return UploadResult::retry(identifier, now(), true, answer);
        case Verdict::refused:
            log.default_(
                "Upload HTTP failed and won't retry, identifier=%{public}@, urlSessionTaskID=%{public}@, "
                "status=%ld, uploadResponse=%@",
                identifier, taskID, status, text);
            return UploadResult::failed(identifier, std::move(response));
        case Verdict::unavailable:
            log.default_("Upload HTTP failed, identifier=%{public}@, urlSessionTaskID=%{public}@, statusCode=%ld",
                         identifier, taskID, status);
            return UploadResult::retry(identifier, now(), true, answer, retryAfter(response, now()));
        case Verdict::unhandled:
            break;
    }
    log.default_(
        "Upload HTTP failed and unhandled. No retry, identifier=%{public}@, urlSessionTaskID=%{public}@, "
        "statusCode=%ld, uploadResponse=%@",
        identifier, taskID, status, text);
    return UploadResult::failed(identifier, std::move(response));
}

std::string UploadService::urlSessionTaskID(const TransferTask& task) {
    const auto opened = session();
    const auto description = opened ? opened->description() : std::nullopt;
    return "<" + description.value_or("") + ">.<" + std::to_string(task.identifier()) + ">";
}

bool UploadService::shouldResume(std::string_view identifier, std::function<void()> completion) {
    const auto opened = session();
    const bool resumes = opened && opened->description() == identifier;
    std::size_t waiting = 0;
    {
        const Lock lock(mutex_);
        waiting = backgroundCompletions_.size();
        if (resumes && completion) backgroundCompletions_.push_back(std::move(completion));
    }
    Log::shared().default_("Should resume session? identifier=%{public}@, result=%d, numberOfCompletions=%ld",
                           identifier, resumes, waiting);
    if (resumes) opened->deliverPendingEvents();
    return resumes;
}

void UploadService::allEventsDelivered() {
    const auto opened = session();
    const auto description = opened ? opened->description() : std::nullopt;
    const std::string name = description.value_or(unknown);
    Log::shared().default_("Upload finished for background session, identifier=%{public}@", name);
    MainQueue::async([self = shared_from_this(), name] { self->invokeBackgroundCompletions(name); });
}

// Taken off the list first, so that each is called once, whatever the completions do.
void UploadService::invokeBackgroundCompletions(const std::string& session) {
    Completions completions;
    {
        const Lock lock(mutex_);
        completions.swap(backgroundCompletions_);
    }
    Log::shared().default_(
        "Upload invoking background completions for session, identifier=%{public}@, numberOfCompletions=%ld", session,
        completions.size());
    invoke(completions);
}

void UploadService::invoke(const Completions& completions) noexcept {
    for (const auto& completion : completions) callHost("background completion", completion);
}

}  // namespace corvane
