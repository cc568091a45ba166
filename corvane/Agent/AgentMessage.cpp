#include <corvane/Agent/AgentMessage.h>

#include <corvane/Agent/WireReader.h>
#include <corvane/Agent/WireWriter.h>

#include <type_traits>
#include <utility>

namespace corvane::agent {

namespace {

template <class Message>
std::string encodeAny(Message& message) {
    return std::visit(
        [](auto& one) {
            WireWriter write;
            one.visit(write);
            return static_cast<char>(std::remove_cvref_t<decltype(one)>::kind) + write.take();
        },
        message);
}

template <class One, class Message>
bool decodeAs(std::uint8_t kind, std::string_view bytes, std::optional<Message>& decoded) {
    if (kind != One::kind) return false;
    One made;
    WireReader read(bytes);
    made.visit(read);
    decoded = std::move(made);
    return true;
}

template <class Message>
std::optional<Message> decodeAny(std::string_view bytes) {
    if (bytes.empty()) throw FormatError("the message is empty");
    const auto kind = static_cast<std::uint8_t>(bytes.front());
    bytes.remove_prefix(1);
    std::optional<Message> decoded;
    [&]<class... Each>(std::type_identity<std::variant<Each...>>) {
        static_cast<void>((decodeAs<Each>(kind, bytes, decoded) || ...));
    }(std::type_identity<Message>{});
    return decoded;
}

}  // namespace

bool isAnswered(const Request& request) {
    return std::visit(
        [](const auto& one) {
            return requires {
                one.isAnswered;
            };
        },
        request);
}
bool isAnswer(const Reply& reply) {
    return std::visit(
        [](const auto& one) {
            return requires {
                one.isAnswer;
            };
        },
        reply);
}

std::string encode(Request message) {
    return encodeAny(message);
}
std::string encode(Reply message) {
    return encodeAny(message);
}
std::optional<Request> decodeRequest(std::string_view bytes) {
    return decodeAny<Request>(bytes);
}
std::optional<Reply> decodeReply(std::string_view bytes) {
    return decodeAny<Reply>(bytes);
}

}  // namespace corvane::agent
