#pragma once

#include <corvane/Upload/ResourceType.h>

#include <string>
#include <utility>

namespace corvane::test {

/// A document given by its JSON text.
class TextResource final : public ResourceType {
  public:
    explicit TextResource(std::string identifier, std::string text = R"({"data":[1,2,3]})",
                          std::string contentType = "application/test+json")
        : identifier_(std::move(identifier)), text_(std::move(text)), contentType_(std::move(contentType)) {}

    [[nodiscard]] std::string contentType() const override { return contentType_; }
    [[nodiscard]] std::string version() const override { return "0.1.0"; }
    [[nodiscard]] std::string identifier() const override { return identifier_; }
    [[nodiscard]] JSON jsonObject() const override { return JSON(text_); }

  private:
    std::string identifier_;
    std::string text_;
    std::string contentType_;
};

}  // namespace corvane::test
