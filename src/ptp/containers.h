// SPDX-License-Identifier: MIT
// What carries PTP: packets of PTP/IP (CIPA DC-005) and containers of the USB still image class (PIMA 15740,
// annex D). Little-endian; both begin with their length in bytes as 32 bits. Pure and *thread-safe*; bytes
// are borrowed.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

namespace brivo {

/// The packet type after the length; 0 for fewer than 8 bytes.
std::uint32_t GetIPPacketType(std::span<const std::byte> data);
/// The container type after the length; 0 for fewer than 6 bytes.
std::uint16_t GetUSBContainerType(std::span<const std::byte> data);

/// Packet types of PTP/IP.
enum PTPIPPacketType : std::uint32_t {
  kPTPIPInitCommandRequest = 1,
  kPTPIPInitCommandAck = 2,
  kPTPIPInitEventRequest = 3,
  kPTPIPInitEventAck = 4,
  kPTPIPInitFail = 5,
  kPTPIPOperationRequest = 6,
  kPTPIPOperationResponse = 7,
  kPTPIPEvent = 8,
  kPTPIPStartData = 9,
  kPTPIPData = 10,
  kPTPIPCancel = 11,
  kPTPIPEndData = 12,
  kPTPIPProbeRequest = 13,
  kPTPIPProbeResponse = 14,
};

/// Container types of the USB still image class.
enum PTPUSBContainerType : std::uint16_t {
  kPTPUSBCommand = 1,
  kPTPUSBData = 2,
  kPTPUSBResponse = 3,
  kPTPUSBEvent = 4,
};

/// One packet or container; what its type does not have is none.
struct PTPContainer {
  enum class Carrier { ip, usb };
  /// What the code is of.
  enum class CodeKind { none, operation, response, event };

  Carrier carrier = Carrier::ip;
  std::uint32_t type = 0;
  std::uint32_t length = 0;  ///< bytes, with the header
  CodeKind codeKind = CodeKind::none;
  std::uint16_t code = 0;  ///< unless codeKind is none
  std::optional<std::uint32_t> transaction;
  std::vector<std::uint32_t> parameters;    ///< five of an operation or a response, three of an event at most
  std::optional<std::uint32_t> dataPhase;   ///< of an operation: 1 no data or data in, 2 data out, 3 unknown
  std::optional<std::uint32_t> connection;  ///< number that the responder gave
  std::optional<std::array<std::byte, 16>> guid;      ///< of the side that sent the packet
  std::optional<std::string> name;                    ///< of that side, in UTF-8
  std::optional<std::uint32_t> version;               ///< of the protocol: major in the upper 16 bits
  std::optional<std::uint32_t> reason;                ///< why a connection was refused
  std::optional<std::uint64_t> totalLength;           ///< bytes of a data phase
  std::optional<std::span<const std::byte>> payload;  ///< in the bytes that were decoded
};

/// The container at the start of `bytes`; others may follow it. None when there is no whole container, when
/// it has an unknown type, or when its fields do not fill it.
std::optional<PTPContainer> decodePTPContainer(std::span<const std::byte> bytes);

/// Such as "operation request".
const char* nameOfPTPContainerType(const PTPContainer& container);

}  // namespace brivo
