#pragma once

#include <filesystem>
#include <string>

namespace corvane {

/// An upload that is ready to go: its payload is in a file and its headers are known. A value.
struct PreparedUploadRequest {
    std::string identifier;             ///< the document's identifier; becomes the transfer task's description
    std::string contentType;            ///< the whole "Content-Type" header value
    std::string userAgent;              ///< the whole "User-Agent" header value
    std::filesystem::path dataFileURL;  ///< the file that holds the gzip-compressed body

    bool operator==(const PreparedUploadRequest&) const = default;
};

}  // namespace corvane
