#pragma once

#include <corvane/Platform/Error.h>

namespace corvane {

/// What a deferred store itself throws: `DeferredStore<Entity>::Errors`. Domain "Corvane.DeferredStore.Errors".
class DeferredStoreError : public Error {
  public:
    enum Code {
        noStore = 0,  ///< neither the database file nor one in memory could be had; the log says why
    };
    explicit DeferredStoreError(Code code);
    DeferredStoreError(const DeferredStoreError&) = default;
    DeferredStoreError& operator=(const DeferredStoreError&) = default;
    ~DeferredStoreError() override;

    [[nodiscard]] Code value() const noexcept { return static_cast<Code>(code()); }
};

}  // namespace corvane
