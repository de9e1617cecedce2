// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <span>
#include <string>

#include "orvidcore/result.h"

namespace orvid {

/// What the catalogue says of one object.
struct ObjectInfo {
  std::uint32_t handle = 0;
  /// Handle of the folder that holds it; 0xFFFFFFFE for a top-level folder.
  std::uint32_t parent = 0;
  std::string name;
  /// From the volume's root, such as "DCIM/100ABCDE/IMG_0001.JPG"; only the name while the parent is unknown.
  std::string path;
  bool isFolder = false;
  bool isProtected = false;
  std::uint64_t size = 0;  ///< bytes
  // Pixels; 0 when unknown.
  std::uint32_t width = 0;
  std::uint32_t height = 0;
  std::uint16_t orientation = 0;  ///< EXIF, 1 to 8; 0 when unknown
  // Seconds since 1970, UTC.
  std::uint64_t captured = 0;
  std::uint64_t modified = 0;
  // Where an embedded thumbnail lies in the file, in bytes, and its size in pixels; 0 when unknown.
  std::uint32_t thumbOffset = 0;
  std::uint32_t thumbSize = 0;
  std::uint32_t thumbWidth = 0;
  std::uint32_t thumbHeight = 0;
};

class SavedFile;
class Session;

/// One object of a device. Cheap to copy; it keeps its device's session. *Thread-safe.*
class Object {
 public:
  /// The most that one read may ask for, in bytes.
  static constexpr std::uint64_t kLongestRead = 4'194'304;
  /// Hears how many bytes of how many have been saved, and says whether to go on.
  using Progress = std::function<bool(std::uint64_t saved, std::uint64_t size)>;
  /// Hears some bytes, which are gone when it returns, and says whether to go on.
  using PieceHandler = std::function<bool(std::span<const std::byte> piece)>;

  Object(std::shared_ptr<Session> session, ObjectInfo info)
      : session_(std::move(session)), info_(std::move(info)) {}

  const ObjectInfo& info() const { return info_; }

  /// The metadata dictionary; empty when the object has none.
  Result<Dictionary> metadata(Timeout timeout = kDefaultTimeout) const;
  void metadataAsync(Callback<Dictionary> done, Timeout timeout = kDefaultTimeout) const;

  /// "thumb" (JPEG bytes), "metadata" and "Orientation", as far as there are any. `maximumPixelSize` is the
  /// wanted width in pixels.
  Result<Dictionary> thumbnail(std::uint32_t maximumPixelSize, Timeout timeout = kDefaultTimeout) const;
  void thumbnailAsync(std::uint32_t maximumPixelSize, Callback<Dictionary> done,
                      Timeout timeout = kDefaultTimeout) const;

  /// Bytes from `offset` on, `length` of them; fewer, perhaps none, when the medium gave fewer.
  Result<Data> read(std::uint64_t offset, std::uint64_t length, Timeout timeout = kDefaultTimeout) const;
  void readAsync(std::uint64_t offset, std::uint64_t length, Callback<Data> done,
                 Timeout timeout = kDefaultTimeout) const;

  /// Hands the bytes from `offset` to the object's end to `handler`, in order, as fast as the medium gives
  /// them; the next ones are on their way meanwhile. Done as well when the handler said to stop; an error
  /// when there were fewer bytes than the object's size. `timeout` holds for each piece.
  Result<Done> stream(std::uint64_t offset, const PieceHandler& handler,
                      Timeout timeout = kDefaultTimeout) const;

  /// Saves the whole object as `path`, which appears in one step when all bytes are on disk; an existing file
  /// is replaced. When the card or the service goes in the middle of a large object, what was saved stays in
  /// a hidden file beside `path`, and the next save of the same object as `path` goes on there. `timeout`
  /// holds for each piece.
  Result<Done> save(const std::string& path, const Progress& progress = nullptr,
                    Timeout timeout = kDefaultTimeout) const;
  void saveAsync(std::string path, Callback<Done> done, Progress progress = nullptr,
                 Timeout timeout = kDefaultTimeout) const;

  /// Deletes the object's file.
  Result<Done> remove(Timeout timeout = kDefaultTimeout) const;
  void removeAsync(Callback<Done> done, Timeout timeout = kDefaultTimeout) const;

 private:
  /// Saves into `file` what it does not have yet, and gives it its name.
  Result<Done> fill(SavedFile& file, const Progress& progress, Timeout timeout) const;

  std::shared_ptr<Session> session_;
  ObjectInfo info_;
};

}  // namespace orvid
