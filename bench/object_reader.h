// SPDX-License-Identifier: MIT
// The two ways to read a whole object that docs/wire.md describes.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>

#include "platform/base/mapping.h"
#include "platform/base/shared_buffer.h"
#include "wire_client.h"

namespace brivo::bench {

/// The size of the pieces in which whole objects are read.
inline constexpr std::uint64_t kPiece = 2'097'152;
/// The handle of the first file of a card with one folder in DCIM; those of its other files follow.
inline constexpr std::uint64_t kFirstFile = 3;

/// The request for reads, and the types of its arguments.
inline constexpr const char* kReadMember = "requestReadDataFromObjectHandle_options_withReply";
inline constexpr const char* kReadSignature = "ta{sv}";

/// Looks at one byte of each page.
void touch(std::span<const std::byte> bytes);
/// Maps the first `size` bytes of a memory file, touches and unmaps them. Throws when it cannot.
void mapAndTouch(const UniqueFd& file, std::size_t size);
/// The same with all pages mapped at once instead of at their touch.
void populateAndTouch(const UniqueFd& file, std::size_t size);

/// The body of a request to read `length` bytes of an object from `offset` on.
std::string rangeRequest(std::uint64_t handle, std::uint64_t offset, std::uint64_t length);

/// An object of a device that is open and has made its catalogue. Throws when it does not get all bytes.
/// *Thread-bound.*
class ObjectReader {
 public:
  /// `client` must outlive this.
  ObjectReader(WireClient& client, std::uint64_t handle, std::uint64_t size)
      : client_(client), handle_(handle), size_(size) {}

  /// Opens a stream, takes piece after piece in memory of the service, touches each, and closes the stream.
  void readStream();
  /// The same with a stream that reads nothing ahead: has the pieces put into two buffers in turn, and
  /// touches one while the other is filled.
  void readIntoBuffers();

 private:
  struct Buffer {
    SharedBuffer file;
    Mapping mapping;
  };
  static Buffer makeBuffer();

  void openStream();
  void openStreamFor(const Buffer& buffer);
  void closeStream();
  /// The size of the piece at `offset`; 0 at the end.
  std::uint64_t pieceAt(std::uint64_t offset) const;
  /// Touches the piece, and gives its size.
  std::uint64_t takePiece(std::uint64_t offset);
  // Each gives the size of the piece at `offset`, and does nothing when there is none.
  std::uint64_t requestInto(const Buffer& buffer, std::uint64_t offset);
  std::uint64_t touchWhatCame(const Buffer& buffer, std::uint64_t offset);

  WireClient& client_;
  const std::uint64_t handle_;
  const std::uint64_t size_;
  std::optional<std::array<Buffer, 2>> buffers_;  // made when they are first needed
};

}  // namespace brivo::bench
