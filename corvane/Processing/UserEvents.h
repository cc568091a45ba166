#pragma once

#include <corvane/Processing/EncodedEvents.h>
#include <corvane/Upload/ResourceType.h>

#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace corvane {

/// The user-events document: the events of one batch with the session they belong to.
class UserEvents final : public ResourceType {
  public:
    static constexpr std::string_view mediaType = "application/vnd.veskar.corvane.user_events+json";
    static constexpr std::string_view formatVersion = "0.1.0";

    using Events = std::vector<std::shared_ptr<const EncodedEvents>>;

    /// @param session the session's JSON form, an object
    /// @param events in their order; none of the parts is empty
    /// @param identifier a new UUID: the document's, not its batch's
    UserEvents(JSON session, Events events, std::string identifier)
        : session_(std::move(session)), events_(std::move(events)), identifier_(std::move(identifier)) {}
    UserEvents(const UserEvents&) = default;
    ~UserEvents() override;

    [[nodiscard]] std::string contentType() const override { return std::string(mediaType); }
    [[nodiscard]] std::string version() const override { return std::string(formatVersion); }
    [[nodiscard]] std::string identifier() const override { return identifier_; }
    /// `{"metadata":{"version","identifier"},"data":{"session","events"}}`.
    [[nodiscard]] JSON jsonObject() const override;

  private:
    const JSON session_;
    const Events events_;
    const std::string identifier_;
};

}  // namespace corvane
