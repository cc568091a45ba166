#pragma once

#include <string>

namespace collector {

/// What a PUT brought: the headers that matter, empty when they are missing, and the body as it was sent.
struct Upload {
    std::string contentType;
    std::string contentEncoding;
    std::string userAgent;
    std::string signature;
    std::string body;
};

/// What is answered: a status, and a line of text for people.
struct Answer {
    int status;
    std::string text;
};

}  // namespace collector
