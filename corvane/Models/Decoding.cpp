#include <corvane/Models/Decoding.h>

namespace corvane {

namespace {
const char* describe(DecodingError::Code code) {
    switch (code) {
        case DecodingError::missing:
            return "there is no such value";
        case DecodingError::wrongType:
            return "the value is of another kind";
        case DecodingError::outOfRange:
            return "the value does not fit the field";
    }
    return "cannot be decoded";
}
}  // namespace

DecodingError::DecodingError(Code code, std::string path)
    : Error("Corvane.DecodingError", code, (path.empty() ? "" : path + ": ") + describe(code)),
      path_(std::move(path)) {}
DecodingError::~DecodingError() = default;

}  // namespace corvane
