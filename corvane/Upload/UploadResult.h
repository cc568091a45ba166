#pragma once

#include <corvane/Platform/Date.h>
#include <corvane/Upload/DeliveryUpdate.h>
#include <corvane/Upload/UploadResponse.h>

#include <chrono>
#include <optional>
#include <string>
#include <utility>
#include <variant>

namespace corvane {

/// How one upload ended, told as what is to be done next. A value. Every alternative carries the identifier of the
/// document, as the transfer task's description gave it.
///
///     std::visit(visitor, result.value);
struct [[nodiscard]] UploadResult {
    /// The collector has the document: forget it.
    struct Success {
        std::string identifier;
        UploadResponse response;
        bool operator==(const Success&) const = default;
    };
    /// The document may get through another time: keep it, and count the attempt.
    struct Retry {
        std::string identifier;
        Date after;             ///< the date from which it may be sent again
        bool isCounted = true;  ///< not when it is certain that nothing of the document was sent
        DeliveryUpdate::Cause cause = {};
        std::optional<std::chrono::seconds> serverDelay = {};  ///< for which the server asks to be left alone
        bool operator==(const Retry&) const = default;
    };
    /// The collector will never take the document: forget it.
    struct Failed {
        std::string identifier;
        UploadResponse response;
        bool operator==(const Failed&) const = default;
    };

    std::variant<Success, Retry, Failed> value;

    static UploadResult success(std::string identifier, UploadResponse response) {
        return {Success{std::move(identifier), std::move(response)}};
    }
    static UploadResult retry(std::string identifier, Date after, bool isCounted = true,
                              DeliveryUpdate::Cause cause = {}, std::optional<std::chrono::seconds> serverDelay = {}) {
        return {Retry{std::move(identifier), after, isCounted, std::move(cause), serverDelay}};
    }
    static UploadResult failed(std::string identifier, UploadResponse response) {
        return {Failed{std::move(identifier), std::move(response)}};
    }

    [[nodiscard]] const std::string& identifier() const {
        return std::visit([](const auto& ending) -> const std::string& { return ending.identifier; }, value);
    }

    /// What decided on it: the server's answer, or whatever came in place of one.
    [[nodiscard]] DeliveryUpdate::Cause cause() const {
        if (const auto* again = std::get_if<Retry>(&value)) return again->cause;
        const auto* success = std::get_if<Success>(&value);
        const auto& response = success ? success->response : std::get<Failed>(value).response;
        return {.reason = DeliveryUpdate::Reason::answer, .status = response.statusCode};
    }

    bool operator==(const UploadResult&) const = default;
};

}  // namespace corvane
