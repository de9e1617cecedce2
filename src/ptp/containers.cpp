// SPDX-License-Identifier: MIT
#include "ptp/containers.h"

#include <algorithm>

#include "platform/base/byte_cursor.h"
#include "platform/text/unicode.h"

namespace brivo {

namespace {

constexpr std::size_t kIPHeader = 8;
constexpr std::size_t kUSBHeader = 12;
constexpr std::size_t kMostParameters = 5;
constexpr std::size_t kMostEventParameters = 3;

void readParameters(PTPContainer& container, ByteCursor& cursor) {
  const bool isEvent = container.codeKind == PTPContainer::CodeKind::event;
  const std::size_t most = isEvent ? kMostEventParameters : kMostParameters;
  const std::size_t count = std::min(cursor.remaining() / 4, most);
  for (std::size_t i = 0; i < count; ++i) container.parameters.push_back(cursor.u32());
}

void readPayload(PTPContainer& container, ByteCursor& cursor) {
  container.payload = cursor.take(cursor.remaining());
}

/// Code units up to a 0 unit, as UTF-8; an overrun of the cursor when there is none.
std::string readName(ByteCursor& cursor) {
  std::u16string units;
  while (const std::uint16_t unit = cursor.u16()) units += static_cast<char16_t>(unit);
  return toUtf8(units);
}

void readSide(PTPContainer& container, ByteCursor& cursor) {
  const auto guid = cursor.take(16);
  if (!cursor.ok()) return;
  std::ranges::copy(guid, container.guid.emplace().begin());
  container.name = readName(cursor);
  container.version = cursor.u32();
}

void readCoded(PTPContainer& container, ByteCursor& cursor, PTPContainer::CodeKind kind) {
  container.codeKind = kind;
  container.code = cursor.u16();
  container.transaction = cursor.u32();
  readParameters(container, cursor);
}

/// What follows the header of a packet of a known type; false for other types.
bool readIPBody(PTPContainer& container, ByteCursor& cursor) {
  using Kind = PTPContainer::CodeKind;
  switch (container.type) {
    case kPTPIPInitCommandAck:
      container.connection = cursor.u32();
      [[fallthrough]];
    case kPTPIPInitCommandRequest:
      readSide(container, cursor);
      return true;
    case kPTPIPInitEventRequest:
      container.connection = cursor.u32();
      return true;
    case kPTPIPInitFail:
      container.reason = cursor.u32();
      return true;
    case kPTPIPOperationRequest:
      container.dataPhase = cursor.u32();
      readCoded(container, cursor, Kind::operation);
      return true;
    case kPTPIPOperationResponse:
      readCoded(container, cursor, Kind::response);
      return true;
    case kPTPIPEvent:
      readCoded(container, cursor, Kind::event);
      return true;
    case kPTPIPStartData:
      container.transaction = cursor.u32();
      container.totalLength = cursor.u64();
      return true;
    case kPTPIPData:
    case kPTPIPEndData:
      container.transaction = cursor.u32();
      readPayload(container, cursor);
      return true;
    case kPTPIPCancel:
      container.transaction = cursor.u32();
      return true;
    case kPTPIPInitEventAck:
    case kPTPIPProbeRequest:
    case kPTPIPProbeResponse:
      return true;
    default:
      return false;
  }
}

/// What follows the type of a container of a known type; false for other types.
bool readUSBBody(PTPContainer& container, ByteCursor& cursor) {
  using Kind = PTPContainer::CodeKind;
  switch (container.type) {
    case kPTPUSBCommand:
      readCoded(container, cursor, Kind::operation);
      return true;
    case kPTPUSBResponse:
      readCoded(container, cursor, Kind::response);
      return true;
    case kPTPUSBEvent:
      readCoded(container, cursor, Kind::event);
      return true;
    case kPTPUSBData:
      container.codeKind = Kind::operation;
      container.code = cursor.u16();
      container.transaction = cursor.u32();
      readPayload(container, cursor);
      return true;
    default:
      return false;
  }
}

/// Reads the container that `bytes` are, no more and no less.
std::optional<PTPContainer> decodeWhole(std::span<const std::byte> bytes, PTPContainer::Carrier carrier) {
  const bool isIP = carrier == PTPContainer::Carrier::ip;
  PTPContainer container;
  container.carrier = carrier;
  container.length = static_cast<std::uint32_t>(bytes.size());
  container.type = isIP ? GetIPPacketType(bytes) : GetUSBContainerType(bytes);
  ByteCursor cursor(bytes);
  cursor.skip(isIP ? 8 : 6);
  const bool known = isIP ? readIPBody(container, cursor) : readUSBBody(container, cursor);
  return known && cursor.ok() && cursor.remaining() == 0 ? std::optional(std::move(container)) : std::nullopt;
}

}  // namespace

std::uint32_t GetIPPacketType(std::span<const std::byte> data) {
  if (data.size() < 8) return 0;
  ByteCursor cursor(data.subspan(4));
  return cursor.u32();
}

std::uint16_t GetUSBContainerType(std::span<const std::byte> data) {
  if (data.size() < 6) return 0;
  ByteCursor cursor(data.subspan(4));
  return cursor.u16();
}

std::optional<PTPContainer> decodePTPContainer(std::span<const std::byte> bytes) {
  const std::uint32_t type = GetIPPacketType(bytes);
  // A packet's type has 32 bits, all small; in a container the upper 16 are a PTP code, which is never 0.
  const bool isIP = type <= 0xFFFF;
  const std::size_t length = ByteCursor(bytes).u32();
  if (length < (isIP ? kIPHeader : kUSBHeader) || length > bytes.size()) return std::nullopt;
  return decodeWhole(bytes.first(length), isIP ? PTPContainer::Carrier::ip : PTPContainer::Carrier::usb);
}

const char* nameOfPTPContainerType(const PTPContainer& container) {
  constexpr std::array<const char*, 15> ipNames{"",
                                                "init command request",
                                                "init command ack",
                                                "init event request",
                                                "init event ack",
                                                "init fail",
                                                "operation request",
                                                "operation response",
                                                "event",
                                                "start data",
                                                "data",
                                                "cancel",
                                                "end data",
                                                "probe request",
                                                "probe response"};
  constexpr std::array<const char*, 5> usbNames{"", "command", "data", "response", "event"};
  const std::span<const char* const> names =
      container.carrier == PTPContainer::Carrier::ip ? std::span<const char* const>(ipNames) : usbNames;
  return container.type < names.size() ? names[container.type] : "";
}

}  // namespace brivo
