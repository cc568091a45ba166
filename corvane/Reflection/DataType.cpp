#include <corvane/Reflection/DataType.h>

#include <cxxabi.h>
#include <cstdlib>
#include <memory>

namespace corvane {

std::string DataType::qualifiedName() const {
    int status = 0;
    const std::unique_ptr<char, decltype(&std::free)> text(abi::__cxa_demangle(type_.name(), nullptr, nullptr, &status),
                                                           &std::free);
    return text ? text.get() : type_.name();
}

}  // namespace corvane
