#pragma once

#include <corvane/Bridge/Models/BridgedDataEventType.h>

#include <memory>
#include <string>
#include <utility>

namespace corvane {

/// A data event with the key by which a session carries it. Callers see it as `CVSessionData`. A value.
class BridgedSessionData {
  public:
    BridgedSessionData(std::string key, std::shared_ptr<const BridgedDataEventType> data)
        : key_(std::move(key)), data_(std::move(data)) {}

    [[nodiscard]] const std::string& key() const { return key_; }
    [[nodiscard]] const std::shared_ptr<const BridgedDataEventType>& data() const { return data_; }

  private:
    std::string key_;
    std::shared_ptr<const BridgedDataEventType> data_;
};

}  // namespace corvane
