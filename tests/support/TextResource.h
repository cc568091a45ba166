#pragma once

#include <corvane/Upload/ResourceType.h>

#include <string>
#include <utility>

namespace corvane::test {

/// A document given by its JSON text.
class TextResource final : public ResourceType {
  public:
    explicit TextResource(std::string identifier, std::string text = R"({"data":[1,2,3]})")
        : identifier_(std::move(identifier)), text_(std::move(text)) {}

    [[nodiscard]] std::string contentType() const override { return "application/test+json"; }
    [[nodiscard]] std::string version() const override { return "0.1.0"; }
    [[nodiscard]] std::string identifier() const override { return identifier_; }
    [[nodiscard]] JSON jsonObject() const override { return JSON(text_); }

  private:
    std::string identifier_;
    std::string text_;
};

}  // namespace corvane::test
