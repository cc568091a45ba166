#include <corvane/Agent/Host/Acknowledgements.h>

namespace corvane {

Acknowledgements& Acknowledgements::shared() {
    static auto& instance = *new Acknowledgements;  // never destroyed: the thread works until the process exits
    return instance;
}

}  // namespace corvane
