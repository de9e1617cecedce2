// SPDX-License-Identifier: MIT
#pragma once

#include "platform/decoding/image_decoder.h"

namespace brivo {

/// Decodes in this process, whose memory bad images can then fill and whose faults are its own: for the
/// worker, for tests and for fuzzing.
class LocalImageDecoder final : public ImageDecoder {
 public:
  /// Has the libraries open now what they would open when they are first used; before files are out of reach.
  static void prepare();

  std::optional<Data> thumbnail(const UniqueFd& file, const ThumbnailRequest& request) override;
  std::vector<std::uint32_t> imageWidths(const UniqueFd& file) override;
  std::optional<Image> image(const UniqueFd& file, std::uint32_t index) override;
};

}  // namespace brivo
