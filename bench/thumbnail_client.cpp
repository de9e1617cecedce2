// SPDX-License-Identifier: MIT
#include "thumbnail_client.h"

#include <stdexcept>

#include "figures.h"
#include "libjpeg_loop.h"
#include "marshalled_options.h"
#include "object_reader.h"
#include "protocol/keys.h"
#include "support/raw_dbus.h"
#include "wire_session.h"

namespace brivo::bench {

namespace {

constexpr const char* kMember = "requestThumbnailDataForObjectHandle_options_withReply";
constexpr const char* kSignature = "ta{sv}";

std::string bodyOf(std::uint64_t handle, unsigned pixels) {
  return marshalled(handle) + MarshalledOptions().setNumber(keys::kThumbnailMaxPixelSize, pixels).bytes();
}

}  // namespace

std::string thumbnailRequest(std::uint64_t handle, unsigned pixels) {
  return test::methodCall(1, kDeviceInterface, kMember, kSignature, bodyOf(handle, pixels));
}

ReceivedThumbnail::ReceivedThumbnail(WireClient& client, std::uint64_t handle, unsigned pixels)
    : answer_(client.call(kDeviceInterface, kMember, kSignature, bodyOf(handle, pixels))) {
  if (!isMemoryUnder(keys::kThumb, answer_)) return;
  memory_ = Mapping::sharedReadable(client.takeDescriptor().get(), memorySizeUnder(keys::kThumb, answer_));
  if (!memory_) throw std::runtime_error("cannot map a thumbnail");
}

std::span<const std::byte> ReceivedThumbnail::bytes() const {
  return memory_ ? memory_.bytes() : std::as_bytes(std::span(bytesUnder(keys::kThumb, answer_)));
}

double timeOfThumbnail(WireClient& client, std::uint64_t handle, unsigned pixels) {
  return millisecondsOf([&] { touch(ReceivedThumbnail(client, handle, pixels).bytes()); });
}

void checkThumbnail(WireClient& client, std::uint64_t handle, unsigned pixels) {
  const unsigned side = longerSideOf(ReceivedThumbnail(client, handle, pixels).bytes());
  if (side == pixels) return;
  throw std::runtime_error("a thumbnail of " + std::to_string(pixels) + " pixels has " +
                           std::to_string(side));
}

}  // namespace brivo::bench
