// SPDX-License-Identifier: MIT
#pragma once

#include "platform/decoding/image_decoder.h"
#include "platform/decoding/worker_pool.h"

namespace brivo {

/// Has confined worker processes decode, so that a bad picture costs its own request alone. Files must be
/// open for reading alone. Thumbnails and pixels are memory files that no process can change any more.
/// *Thread-safe.*
class ImagingService final : public ImageDecoder {
 public:
  /// `workers` must outlive this.
  explicit ImagingService(WorkerPool& workers) : workers_(workers) {}

  std::optional<Data> thumbnail(const UniqueFd& file, const ThumbnailRequest& request) override;
  std::vector<std::uint32_t> imageWidths(const UniqueFd& file) override;
  std::optional<Image> image(const UniqueFd& file, std::uint32_t index) override;

 private:
  WorkerPool& workers_;
};

}  // namespace brivo
