#include <corvane/Upload/UploadResponse.h>

#include <corvane/Models/Encoder.h>

#include <utility>

namespace corvane {

std::string UploadResponse::jsonText() const {
    Encoder encoder;
    encoder.beginObject();
    encoder.key("statusCode");
    encoder.integer(statusCode);
    encoder.key("headers");
    encoder.beginObject();
    for (const auto& [name, text] : headers) {
        encoder.key(name);
        encoder.string(text);
    }
    encoder.endObject();
    encoder.endObject();
    return std::move(encoder).take();
}

std::string UploadResponse::description() const {
    std::string text = "UploadResponse(statusCode: " + std::to_string(statusCode) + ", headers: [";
    const char* separator = "";
    for (const auto& [name, value] : headers) {
        text.append(separator).append("\"").append(name).append("\": \"").append(value).append("\"");
        separator = ", ";
    }
    return text.append(headers.empty() ? ":])" : "])");
}

}  // namespace corvane
