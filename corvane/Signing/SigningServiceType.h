#pragma once

#include <corvane/Export.h>

#include <memory>
#include <string>
#include <string_view>

namespace corvane {

/// Signs the digests of uploads. A host puts its own in place, over its key store or hardware; otherwise the library
/// uses a `FileSigningService`.
class CORVANE_EXPORT SigningServiceType {
  public:
    virtual ~SigningServiceType() = default;

    /// The signature, as bytes, of the 20 bytes of `digest`. Throws what the signing failed with. May be called from
    /// several threads at once.
    [[nodiscard]] virtual std::string sign(std::string_view digest) = 0;

    /// Replaces the process's service; an empty one brings the default back. Call it before the first upload. Safe from
    /// any thread.
    static void setShared(std::shared_ptr<SigningServiceType> service);
    /// The process's service. Safe from any thread.
    [[nodiscard]] static std::shared_ptr<SigningServiceType> shared();
};

}  // namespace corvane
