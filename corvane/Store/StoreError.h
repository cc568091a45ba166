#pragma once

#include <corvane/Platform/Error.h>
#include <corvane/Store/StoreLocation.h>

#include <optional>
#include <string>
#include <string_view>

namespace corvane {

/// What a store's operations throw: `Store<Entity>::Errors`. Domain "Corvane.Store.Errors".
///
/// The message holds the database's own reason, and of the statement the part before its first value: what users did
/// stays out of logs.
class StoreError : public Error {
  public:
    enum Code {
        cantOpen = 0,       ///< the database was not opened; see location()
        prepare = 1,        ///< the statement could not be prepared; see sql()
        execute = 2,        ///< the statement did not run to its end; see sql()
        missingHandle = 3,  ///< a statement was issued without an open database
    };

    [[nodiscard]] static StoreError makeCantOpen(StoreLocation location, std::string_view reason);
    [[nodiscard]] static StoreError makePrepare(std::string sql, std::string_view reason);
    [[nodiscard]] static StoreError makeExecute(std::string sql, std::string_view reason);
    [[nodiscard]] static StoreError makeMissingHandle();
    StoreError(const StoreError&) = default;
    StoreError& operator=(const StoreError&) = default;
    ~StoreError() override;

    [[nodiscard]] Code value() const noexcept { return static_cast<Code>(code()); }
    /// The location that could not be opened; nothing for the other errors.
    [[nodiscard]] const std::optional<StoreLocation>& location() const noexcept { return location_; }
    /// The whole statement, values and all; empty for errors without one.
    [[nodiscard]] const std::string& sql() const noexcept { return sql_; }

  private:
    StoreError(Code code, std::string message);

    std::optional<StoreLocation> location_;
    std::string sql_;
};

}  // namespace corvane
