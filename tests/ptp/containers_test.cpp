// SPDX-License-Identifier: MIT
#include "ptp/containers.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <random>

#include "ptp/records.h"

namespace brivo {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

/// Bytes in the making.
class Bytes {
 public:
  Bytes& u16(std::uint16_t value) { return integer(value, 2); }
  Bytes& u32(std::uint32_t value) { return integer(value, 4); }
  Bytes& u64(std::uint64_t value) { return integer(value, 8); }
  Bytes& text(std::u16string_view units) {
    for (const char16_t unit : units) u16(unit);
    return u16(0);
  }
  Bytes& guid() {
    for (int i = 0; i < 16; ++i) integer(static_cast<std::uint64_t>(i), 1);
    return *this;
  }
  Bytes& raw(std::initializer_list<int> values) {
    for (const int value : values) integer(static_cast<std::uint64_t>(value), 1);
    return *this;
  }
  /// The bytes behind their own length.
  std::vector<std::byte> framed() const {
    Bytes whole;
    whole.u32(static_cast<std::uint32_t>(bytes_.size() + 4));
    whole.bytes_.insert(whole.bytes_.end(), bytes_.begin(), bytes_.end());
    return whole.bytes_;
  }
  const std::vector<std::byte>& bare() const { return bytes_; }

 private:
  Bytes& integer(std::uint64_t value, int width) {
    for (int i = 0; i < width; ++i) bytes_.push_back(static_cast<std::byte>(value >> (8 * i)));
    return *this;
  }
  std::vector<std::byte> bytes_;
};

std::vector<std::byte> command() {
  return Bytes().u16(kPTPUSBCommand).u16(0x1007).u32(3).u32(0xFFFFFFFF).u32(0).u32(9).framed();
}

/// Decodes what must be a container.
PTPContainer decoded(const std::vector<std::byte>& bytes) {
  const auto container = decodePTPContainer(bytes);
  EXPECT_TRUE(container);
  if (!container) return {};
  EXPECT_EQ(container->length, bytes.size());
  return *container;
}

TEST(ContainersTest, ThePacketTypeIs32BitsAtOffset4AndNeeds8Bytes) {
  const auto bytes = Bytes().u32(99).u32(0x01020304).bare();
  EXPECT_EQ(GetIPPacketType(bytes), 0x01020304u);
  for (std::size_t size = 0; size < 8; ++size) EXPECT_EQ(GetIPPacketType(std::span(bytes).first(size)), 0u);
}

TEST(ContainersTest, TheContainerTypeIs16BitsAtOffset4AndNeeds6Bytes) {
  const auto bytes = Bytes().u32(99).u16(0x0304).bare();
  EXPECT_EQ(GetUSBContainerType(bytes), 0x0304);
  for (std::size_t size = 0; size < 6; ++size) {
    EXPECT_EQ(GetUSBContainerType(std::span(bytes).first(size)), 0);
  }
}

TEST(ContainersTest, AUsbCommandHasItsCodeItsTransactionAndItsParameters) {
  const PTPContainer container = decoded(command());
  EXPECT_EQ(container.carrier, PTPContainer::Carrier::usb);
  EXPECT_EQ(container.type, 1u);
  EXPECT_EQ(container.codeKind, PTPContainer::CodeKind::operation);
  EXPECT_EQ(container.code, 0x1007);
  EXPECT_EQ(container.transaction, 3u);
  EXPECT_THAT(container.parameters, ElementsAre(0xFFFFFFFFu, 0u, 9u));
  EXPECT_STREQ(nameOfPTPContainerType(container), "command");
}

TEST(ContainersTest, AUsbDataContainerHasItsPayload) {
  const auto bytes = Bytes().u16(kPTPUSBData).u16(0x1009).u32(4).raw({7, 8, 9}).framed();
  const PTPContainer container = decoded(bytes);
  EXPECT_EQ(container.codeKind, PTPContainer::CodeKind::operation);
  EXPECT_THAT(*container.payload, ElementsAre(std::byte{7}, std::byte{8}, std::byte{9}));
  EXPECT_EQ(container.payload->data(), bytes.data() + 12) << "borrowed";
  EXPECT_STREQ(nameOfPTPContainerType(container), "data");
}

TEST(ContainersTest, AUsbResponseAndAUsbEvent) {
  const PTPContainer response = decoded(Bytes().u16(kPTPUSBResponse).u16(0x2001).u32(4).framed());
  EXPECT_EQ(response.codeKind, PTPContainer::CodeKind::response);
  EXPECT_THAT(response.parameters, IsEmpty());
  EXPECT_STREQ(nameOfPTPContainerType(response), "response");
  const PTPContainer event = decoded(Bytes().u16(kPTPUSBEvent).u16(0x4002).u32(4).u32(77).framed());
  EXPECT_EQ(event.codeKind, PTPContainer::CodeKind::event);
  EXPECT_THAT(event.parameters, ElementsAre(77u));
  EXPECT_STREQ(nameOfPTPContainerType(event), "event");
}

TEST(ContainersTest, APacketThatBeginsAConnection) {
  const PTPContainer request =
      decoded(Bytes().u32(kPTPIPInitCommandRequest).guid().text(u"K\u00E4mera").u32(0x10000).framed());
  EXPECT_EQ(request.carrier, PTPContainer::Carrier::ip);
  EXPECT_EQ((*request.guid)[15], std::byte{15});
  EXPECT_EQ(request.name, "K\xC3\xA4mera");
  EXPECT_EQ(request.version, 0x10000u);
  EXPECT_EQ(request.connection, std::nullopt);
  const PTPContainer ack =
      decoded(Bytes().u32(kPTPIPInitCommandAck).u32(12).guid().text(u"").u32(0x10000).framed());
  EXPECT_EQ(ack.connection, 12u);
  EXPECT_EQ(ack.name, "");
}

TEST(ContainersTest, ThePacketsOfTheEventConnectionAndOfARefusal) {
  EXPECT_EQ(decoded(Bytes().u32(kPTPIPInitEventRequest).u32(12).framed()).connection, 12u);
  EXPECT_EQ(decoded(Bytes().u32(kPTPIPInitEventAck).framed()).connection, std::nullopt);
  EXPECT_EQ(decoded(Bytes().u32(kPTPIPInitFail).u32(2).framed()).reason, 2u);
}

TEST(ContainersTest, AnIpOperationItsResponseAndAnEvent) {
  const PTPContainer request =
      decoded(Bytes().u32(kPTPIPOperationRequest).u32(1).u16(0x1002).u32(5).u32(1).framed());
  EXPECT_EQ(request.dataPhase, 1u);
  EXPECT_EQ(request.codeKind, PTPContainer::CodeKind::operation);
  EXPECT_EQ(request.code, 0x1002);
  EXPECT_EQ(request.transaction, 5u);
  EXPECT_THAT(request.parameters, ElementsAre(1u));
  EXPECT_EQ(decoded(Bytes().u32(kPTPIPOperationResponse).u16(0x2001).u32(5).framed()).codeKind,
            PTPContainer::CodeKind::response);
  EXPECT_EQ(decoded(Bytes().u32(kPTPIPEvent).u16(0x4002).u32(5).u32(1).framed()).codeKind,
            PTPContainer::CodeKind::event);
}

TEST(ContainersTest, TheThreePacketsOfADataPhaseAndItsCancellation) {
  EXPECT_EQ(decoded(Bytes().u32(kPTPIPStartData).u32(5).u64(5'000'000'000).framed()).totalLength,
            5'000'000'000u);
  const auto data = Bytes().u32(kPTPIPData).u32(5).raw({1, 2}).framed();
  EXPECT_EQ(decoded(data).payload->size(), 2u);
  EXPECT_EQ(decoded(Bytes().u32(kPTPIPEndData).u32(5).framed()).payload->size(), 0u);
  EXPECT_EQ(decoded(Bytes().u32(kPTPIPCancel).u32(5).framed()).transaction, 5u);
}

TEST(ContainersTest, ProbesHaveNothingButTheirType) {
  EXPECT_STREQ(nameOfPTPContainerType(decoded(Bytes().u32(kPTPIPProbeRequest).framed())), "probe request");
  EXPECT_STREQ(nameOfPTPContainerType(decoded(Bytes().u32(kPTPIPProbeResponse).framed())), "probe response");
}

TEST(ContainersTest, ACutContainerIsNone) {
  for (const auto& whole :
       {command(), Bytes().u32(kPTPIPInitCommandRequest).guid().text(u"x").u32(1).framed()}) {
    for (std::size_t size = 0; size < whole.size(); ++size) {
      EXPECT_FALSE(decodePTPContainer(std::span(whole).first(size))) << size;
    }
  }
}

TEST(ContainersTest, ALengthThatDoesNotHoldTheFieldsIsNone) {
  EXPECT_FALSE(decodePTPContainer(Bytes().u32(kPTPIPInitFail).framed()));
  EXPECT_FALSE(decodePTPContainer(Bytes().u32(kPTPIPInitCommandRequest).guid().u16('x').u16('y').framed()))
      << "a name without an end";
  EXPECT_FALSE(decodePTPContainer(Bytes().u16(kPTPUSBCommand).u16(0x1001).framed()));
  const auto lying = Bytes().u32(3).u16(kPTPUSBCommand).u16(0x1001).u32(1).bare();
  EXPECT_FALSE(decodePTPContainer(lying)) << "shorter than a header";
}

TEST(ContainersTest, WhatTheFieldsLeaveOverMakesItNone) {
  EXPECT_FALSE(decodePTPContainer(Bytes().u32(kPTPIPProbeRequest).raw({0}).framed()));
  EXPECT_FALSE(decodePTPContainer(Bytes().u16(kPTPUSBCommand).u16(0x1001).u32(1).raw({0, 0}).framed()));
  Bytes six;
  six.u16(kPTPUSBCommand).u16(0x1001).u32(1);
  for (int i = 0; i < 6; ++i) six.u32(0);
  EXPECT_FALSE(decodePTPContainer(six.framed())) << "an operation has five parameters at most";
  EXPECT_FALSE(
      decodePTPContainer(Bytes().u16(kPTPUSBEvent).u16(0x4002).u32(1).u32(0).u32(0).u32(0).u32(0).framed()))
      << "an event three";
}

TEST(ContainersTest, UnknownTypesAreNone) {
  EXPECT_FALSE(decodePTPContainer(Bytes().u32(0).framed()));
  EXPECT_FALSE(decodePTPContainer(Bytes().u32(15).framed()));
  EXPECT_FALSE(decodePTPContainer(Bytes().u16(5).u16(0x1001).u32(1).framed()));
  EXPECT_FALSE(decodePTPContainer(Bytes().u16(0).u16(0x1001).u32(1).framed()));
}

TEST(RecordsTest, RecordsOfAllKindsAreTakenOneAfterTheOther) {
  MSObjectInfoDataset dataset;
  dataset.setObjectHandle(42);
  dataset.setFilename("IMG_0001.JPG");
  const Data content = dataset.content();
  std::vector<std::byte> all(content.bytes().begin(), content.bytes().end());
  for (const auto& more : {command(), Bytes().u32(kPTPIPProbeRequest).framed()}) {
    all.insert(all.end(), more.begin(), more.end());
  }
  std::span<const std::byte> rest = all;
  const auto first = takePTPRecord(rest);
  ASSERT_TRUE(first);
  EXPECT_EQ(std::get<MSObjectInfoDataset>(*first).filename(), "IMG_0001.JPG");
  EXPECT_EQ(rest.size(), all.size() - content.size());
  EXPECT_EQ(std::get<PTPContainer>(*takePTPRecord(rest)).code, 0x1007);
  EXPECT_EQ(std::get<PTPContainer>(*takePTPRecord(rest)).type, kPTPIPProbeRequest);
  EXPECT_TRUE(rest.empty());
  EXPECT_FALSE(takePTPRecord(rest));
}

TEST(RecordsTest, ADatasetOfEveryNameLengthIsTakenWhole) {
  for (std::size_t units = 0; units <= 255; ++units) {
    MSObjectInfoDataset dataset;
    dataset.setFilename(std::string(units, 'x'));
    const Data content = dataset.content();
    std::span<const std::byte> rest = content.bytes();
    const auto record = takePTPRecord(rest);
    ASSERT_TRUE(record) << units;
    EXPECT_TRUE(rest.empty());
    // The count byte of the longest name wraps to 0.
    EXPECT_EQ(std::get<MSObjectInfoDataset>(*record).filename().size(), units == 255 ? 0 : units);
  }
}

TEST(RecordsTest, ACutDatasetOrOneWhoseNameLeavesItIsNoneAndNothingIsTaken) {
  MSObjectInfoDataset dataset;
  dataset.setFilename("DCIM");
  const Data content = dataset.content();
  for (std::size_t size = 0; size < content.size(); ++size) {
    std::span<const std::byte> rest = content.bytes().first(size);
    EXPECT_FALSE(takePTPRecord(rest)) << size;
    EXPECT_EQ(rest.size(), size);
  }
  std::vector<std::byte> bytes(content.bytes().begin(), content.bytes().end());
  bytes[74] = std::byte{200};
  std::span<const std::byte> rest = bytes;
  EXPECT_FALSE(takePTPRecord(rest));
}

TEST(RecordsTest, RandomBytesNeverLeadOutside) {
  std::mt19937 random(6);
  for (int i = 0; i < 20'000; ++i) {
    std::vector<std::byte> bytes(random() % 120);
    for (auto& byte : bytes) byte = static_cast<std::byte>(random() % 4 == 0 ? random() : random() % 16);
    if (bytes.size() > 8) {
      bytes[0] = static_cast<std::byte>(bytes.size() - random() % 2);
      bytes[1] = bytes[2] = bytes[3] = bytes[5] = std::byte{0};
    }
    std::span<const std::byte> rest = bytes;
    while (takePTPRecord(rest)) {
      EXPECT_LT(rest.size(), bytes.size());
    }
  }
}

}  // namespace
}  // namespace brivo
