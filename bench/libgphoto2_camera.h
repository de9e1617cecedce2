// SPDX-License-Identifier: MIT
#pragma once

#include <gphoto2/gphoto2-camera.h>

#include <memory>
#include <string>

namespace brivo::bench {

/// A card as libgphoto2's "Mass Storage Camera", in this process. Throws when the library fails.
/// *Thread-bound.*
class Libgphoto2Camera {
 public:
  /// Lists the files of `folder` of the card at the path `card`, the folder as on the card.
  Libgphoto2Camera(const std::string& card, const std::string& folder);

  /// The thumbnail in the EXIF block of a picture in the folder. The library keeps it in memory.
  std::string thumbnail(const std::string& name) const;

 private:
  struct Free {
    void operator()(GPContext* context) const { ::gp_context_unref(context); }
    void operator()(Camera* camera) const { ::gp_camera_unref(camera); }
  };
  void chooseModel() const;
  void choosePort(const std::string& path) const;
  void list() const;

  const std::string folder_;
  const std::unique_ptr<GPContext, Free> context_;
  std::unique_ptr<Camera, Free> camera_;
};

}  // namespace brivo::bench
