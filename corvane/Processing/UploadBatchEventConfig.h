#pragma once

#include <corvane/Export.h>

#include <cstddef>

namespace corvane {

/// How the batching processor batches. A value.
class CORVANE_EXPORT UploadBatchEventConfig {
  public:
    /// The default values: batches of 50, no debugging copies.
    UploadBatchEventConfig() = default;
    /// @param batchSize how many events of a session make a document that is sent; at least 1
    /// @param batchDebugging whether readable copies of documents and responses are kept beside the payload files
    /// Throws `InvalidArgument` for a batch size below 1.
    UploadBatchEventConfig(int batchSize, bool batchDebugging);

    /// The one shared instance of the default values.
    [[nodiscard]] static const UploadBatchEventConfig& default_();

    [[nodiscard]] std::size_t batchSize() const { return batchSize_; }
    [[nodiscard]] bool batchDebugging() const { return batchDebugging_; }

  private:
    std::size_t batchSize_ = 50;
    bool batchDebugging_ = false;
};

}  // namespace corvane
