// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <span>
#include <string>

#include "orvidcore/object.h"
#include "platform/files/part_file.h"

namespace orvid {

/// The file that an object is saved as: it appears under its name only when it is whole and on disk. What was
/// saved of a large object before the card or the service went stays beside it, hidden, for the next try.
/// *Thread-bound.*
class SavedFile {
 public:
  /// Makes the file, or goes on with what an earlier try left of the same object under the same name.
  static Result<SavedFile> open(const std::string& path, const ObjectInfo& object);

  /// Bytes that are there.
  std::uint64_t size() const { return part_->size(); }
  /// The last bytes that are there, at most `most`.
  Result<Data> tail(std::size_t most) const;
  Result<Done> startOver();
  Result<Done> append(std::span<const std::byte> bytes);
  /// Gives the file its name, when it has `size` bytes.
  Result<Done> commit(std::uint64_t size);
  /// Ends it without a name. Keeps what is worth being gone on with when `failure` may pass.
  void giveUp(const Error& failure);

 private:
  SavedFile(std::string path, std::unique_ptr<brivo::PartFile> part)
      : path_(std::move(path)), part_(std::move(part)) {}

  std::string path_;
  std::unique_ptr<brivo::PartFile> part_;
};

}  // namespace orvid
