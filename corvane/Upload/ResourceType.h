#pragma once

#include <corvane/Models/JSON.h>

#include <string>

namespace corvane {

/// A document that can be uploaded. Implementations do not change once they are handed over, and may be read from any
/// thread.
class ResourceType {
  public:
    virtual ~ResourceType() = default;

    /// The base media type, without parameters.
    [[nodiscard]] virtual std::string contentType() const = 0;
    /// The version of the document's format, such as "0.1.0".
    [[nodiscard]] virtual std::string version() const = 0;
    /// Unique per upload: the key of the upload's row, the name of its payload file and the description of its transfer
    /// task. It must be able to name a file.
    [[nodiscard]] virtual std::string identifier() const = 0;
    /// The document, a JSON object. May throw; the upload is then refused with the error.
    [[nodiscard]] virtual JSON jsonObject() const = 0;

  protected:
    ResourceType() = default;
    ResourceType(const ResourceType&) = default;
    ResourceType& operator=(const ResourceType&) = default;
};

}  // namespace corvane
