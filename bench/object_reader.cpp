// SPDX-License-Identifier: MIT
#include "object_reader.h"

#include <sys/mman.h>

#include <algorithm>
#include <stdexcept>
#include <string>

#include "marshalled_options.h"
#include "protocol/keys.h"
#include "wire_session.h"

namespace brivo::bench {

namespace {

constexpr std::size_t kPage = 4096;

/// Shorter data comes in the answer itself.
constexpr std::uint64_t kShortestMemory = 65'536;

Mapping mapped(const UniqueFd& file, std::size_t size) {
  Mapping mapping = Mapping::sharedReadable(file.get(), size);
  if (!mapping) throw std::runtime_error("cannot map what was read");
  return mapping;
}

MarshalledOptions rangeOptions(std::uint64_t offset, std::uint64_t length) {
  MarshalledOptions options;
  options.setNumber(keys::kReadOffset, offset).setNumber(keys::kReadLength, length);
  return options;
}

}  // namespace

void touch(std::span<const std::byte> bytes) {
  const volatile std::byte* const looked = bytes.data();
  for (std::size_t place = 0; place < bytes.size(); place += kPage) (void)looked[place];
}

void mapAndTouch(const UniqueFd& file, std::size_t size) { touch(mapped(file, size).bytes()); }

void populateAndTouch(const UniqueFd& file, std::size_t size) {
  const Mapping mapping = mapped(file, size);
  ::madvise(mapping.bytes().data(), mapping.size(), MADV_POPULATE_READ);
  touch(mapping.bytes());
}

std::string rangeRequest(std::uint64_t handle, std::uint64_t offset, std::uint64_t length) {
  return marshalled(handle) + rangeOptions(offset, length).bytes();
}

// ------------------------------------------------------------------------------------------------- as a
// stream

void ObjectReader::readStream() {
  openStream();
  for (std::uint64_t offset = 0; offset < size_;) offset += takePiece(offset);
  closeStream();
}

void ObjectReader::openStream() {
  const std::string options = MarshalledOptions().setTrue(keys::kReadBufferStreamOpen).bytes();
  client_.call(kDeviceInterface, kReadMember, kReadSignature, marshalled(handle_) + options);
}

void ObjectReader::closeStream() {
  const std::string options = MarshalledOptions().setTrue(keys::kReadBufferStreamClose).bytes();
  client_.call(kDeviceInterface, kReadMember, kReadSignature, marshalled(handle_) + options);
}

std::uint64_t ObjectReader::pieceAt(std::uint64_t offset) const { return std::min(kPiece, size_ - offset); }

std::uint64_t ObjectReader::takePiece(std::uint64_t offset) {
  const std::uint64_t length = pieceAt(offset);
  if (length < kShortestMemory) throw std::runtime_error("the object's last piece is too short");
  client_.post(kDeviceInterface, kReadMember, kReadSignature, rangeRequest(handle_, offset, length));
  const std::uint64_t size = memorySizeUnder(keys::kReadData, client_.receiveAnswer());
  if (size != length) throw std::runtime_error("a piece of a stream is too short");
  populateAndTouch(client_.takeDescriptor(), size);
  return size;
}

// ----------------------------------------------------------------------------------------------- into
// buffers

void ObjectReader::readIntoBuffers() {
  if (!buffers_) buffers_.emplace(std::array{makeBuffer(), makeBuffer()});
  openStreamFor(buffers_->front());
  std::uint64_t requested = 0;
  for (const Buffer& buffer : *buffers_) requested += requestInto(buffer, requested);
  for (std::uint64_t received = 0; received < size_;) {
    for (const Buffer& buffer : *buffers_) {
      received += touchWhatCame(buffer, received);
      requested += requestInto(buffer, requested);
    }
  }
  closeStream();
}

ObjectReader::Buffer ObjectReader::makeBuffer() {
  auto file = SharedBuffer::create("bench-buffer", kPiece);
  if (!file) throw std::runtime_error("no memory for a buffer");
  Mapping mapping = Mapping::sharedReadable(file->fd(), kPiece);
  if (!mapping) throw std::runtime_error("cannot map a buffer");
  return {*std::move(file), std::move(mapping)};
}

void ObjectReader::openStreamFor(const Buffer& buffer) {
  const std::string options =
      MarshalledOptions().setTrue(keys::kReadBufferStreamOpen).setMemory(keys::kReadBuffer, kPiece).bytes();
  client_.post(kDeviceInterface, kReadMember, kReadSignature, marshalled(handle_) + options,
               buffer.file.fd());
  client_.receiveAnswer();
}

std::uint64_t ObjectReader::requestInto(const Buffer& buffer, std::uint64_t offset) {
  const std::uint64_t length = pieceAt(offset);
  if (length == 0) return 0;
  const std::string options = rangeOptions(offset, length).setMemory(keys::kReadBuffer, kPiece).bytes();
  client_.post(kDeviceInterface, kReadMember, kReadSignature, marshalled(handle_) + options,
               buffer.file.fd());
  return length;
}

std::uint64_t ObjectReader::touchWhatCame(const Buffer& buffer, std::uint64_t offset) {
  const std::uint64_t length = pieceAt(offset);
  if (length == 0) return 0;
  if (numberUnder(keys::kReadBufferCount, client_.receiveAnswer()) != length) {
    throw std::runtime_error("a read into a buffer is too short");
  }
  touch(buffer.mapping.bytes().first(length));
  return length;
}

}  // namespace brivo::bench
