#include "send.h"

#include "Payload.h"
#include "StoredDatabase.h"
#include "text.h"

#include <corvane/Platform/Bytes.h>
#include <corvane/Signing/FileSigningService.h>
#include <corvane/Signing/SHA1.h>

#include <curl/curl.h>

#include <algorithm>
#include <memory>
#include <system_error>

namespace inspect {

namespace {

struct Cleanup {
    void operator()(CURL* handle) const noexcept { curl_easy_cleanup(handle); }
    void operator()(curl_slist* list) const noexcept { curl_slist_free_all(list); }
};

// The host's key, which is used and never made here.
std::string signatureFor(const Directory& directory, const std::string& body) {
    std::error_code error;
    if (!std::filesystem::exists(directory.path / corvane::FileSigningService::keyFileName, error)) {
        return "SigningFailure=there is no signing key";
    }
    corvane::FileSigningService service(directory.path);
    return corvane::base64String(service.sign(corvane::sha1Digest(body)));
}

std::size_t keep(const char* bytes, std::size_t, std::size_t count, void* answer) {
    constexpr std::size_t most = 1000;
    auto& text = *static_cast<std::string*>(answer);
    text.append(bytes, std::min(count, most - std::min(most, text.size())));
    return count;
}

}  // namespace

std::string send(const Directory& directory, const Document& document, const std::string& url, bool& isAccepted) {
    const auto payload =
        Payload::read(document.payload, std::nullopt, directory.path / corvane::FileSigningService::publicKeyFileName);
    const std::unique_ptr<CURL, Cleanup> handle(curl_easy_init());
    if (!handle) throw Problem("libcurl has no handle");
    std::unique_ptr<curl_slist, Cleanup> headers;
    for (const std::string& header :
         {"Content-Type: " + document.contentType, "User-Agent: " + document.userAgent,
          std::string("Content-Encoding: gzip"), "X-Veskar-ActionSignature: " + signatureFor(directory, payload.body),
          std::string("Expect:")}) {
        if (corvane::holdsControlCharacter(header)) throw Problem("a header of the document holds a control character");
        curl_slist* const longer = curl_slist_append(headers.get(), header.c_str());
        if (!longer) throw std::bad_alloc();
        static_cast<void>(headers.release());
        headers.reset(longer);
    }
    std::string answer;
    CURL* const curl = handle.get();
    curl_easy_setopt(curl, CURLOPT_URL, url.c_str());
    curl_easy_setopt(curl, CURLOPT_PROTOCOLS_STR, "http,https");
    curl_easy_setopt(curl, CURLOPT_CUSTOMREQUEST, "PUT");
    curl_easy_setopt(curl, CURLOPT_POSTFIELDS, payload.body.data());
    curl_easy_setopt(curl, CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(payload.body.size()));
    curl_easy_setopt(curl, CURLOPT_HTTPHEADER, headers.get());
    curl_easy_setopt(curl, CURLOPT_NOSIGNAL, 1L);
    curl_easy_setopt(curl, CURLOPT_CONNECTTIMEOUT, 10L);
    curl_easy_setopt(curl, CURLOPT_LOW_SPEED_LIMIT, 1L);
    curl_easy_setopt(curl, CURLOPT_LOW_SPEED_TIME, 60L);
    curl_easy_setopt(curl, CURLOPT_WRITEFUNCTION, &keep);
    curl_easy_setopt(curl, CURLOPT_WRITEDATA, &answer);
    const CURLcode result = curl_easy_perform(curl);
    long status = 0;
    curl_easy_getinfo(curl, CURLINFO_RESPONSE_CODE, &status);
    if (result != CURLE_OK) throw Problem(std::string("not sent: ") + curl_easy_strerror(result));
    isAccepted = status >= 200 && status < 300;
    return "status " + std::to_string(status) + " " + printable(answer.substr(0, answer.find('\n')));
}

}  // namespace inspect
