// SPDX-License-Identifier: MIT
#include "device/object_requests.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <limits>

#include "content/recording_device.h"
#include "device/fake_connection.h"
#include "protocol/keys.h"
#include "support/temporary_folder.h"

namespace brivo {
namespace {

constexpr std::int32_t kClient = 11;
constexpr std::uint64_t kSlot = 2'097'152;

class ObjectRequestsTest : public testing::Test {
 protected:
  std::shared_ptr<BrivoFile> makeFile(const std::string& content, const std::string& name = "IMG_0001.JPG") {
    test::writeFile(card / name, content);
    auto file = BrivoFile::initWithFSURL(card / name, name, nullptr, *device);
    index.addCameraFileToIndex(file);
    return file;
  }
  /// The one answer of a request.
  template <class Request>
  Dictionary answer(Request request) {
    std::vector<Dictionary> answers;
    request([&](Dictionary result) { answers.push_back(std::move(result)); });
    EXPECT_EQ(answers.size(), 1u);
    return answers.empty() ? Dictionary() : answers.front();
  }
  Dictionary read(std::uint64_t handle, const Dictionary& options, std::int32_t client = kClient) {
    return answer([&](const ResultHandler& reply) {
      requests.requestReadDataFromObjectHandle(handle, options, client, reply);
    });
  }
  static Dictionary range(std::uint64_t offset, std::uint64_t length) {
    return {{"OVReadOffset", offset}, {"OVReadLength", length}};
  }
  static std::int64_t code(const Dictionary& result) { return *result.signedInteger("errCode"); }
  static std::string_view data(const Dictionary& result) { return result.data("OVReadData")->text(); }

  test::TemporaryFolder card;
  std::shared_ptr<RecordingDevice> device = std::make_shared<RecordingDevice>();
  CatalogueCounters counters;
  ObjectIndex index{counters};
  std::shared_ptr<OVClientManager> clients = std::make_shared<OVClientManager>([](const Task&) {});
  DeviceNotifications notifications{*clients, counters, [] { return "UUID"; }};
  ReadMemory readMemory{4'194'304};
  ObjectRequests requests{index, notifications, readMemory};
};

TEST_F(ObjectRequestsTest, OffsetEqualToTheSizeIsOutsideAndTheWholeFileIsInside) {
  const auto file = makeFile("0123456789");
  EXPECT_EQ(code(read(file->objHandle(), range(10, 1))), -21449);
  const Dictionary whole = read(file->objHandle(), range(0, 10));
  EXPECT_EQ(code(whole), 0);
  EXPECT_EQ(data(whole), "0123456789");
}

TEST_F(ObjectRequestsTest, RangesAreExact) {
  const auto file = makeFile("0123456789");
  EXPECT_EQ(data(read(file->objHandle(), range(9, 1))), "9");
  EXPECT_EQ(data(read(file->objHandle(), range(3, 4))), "3456");
  EXPECT_EQ(code(read(file->objHandle(), range(3, 8))), -21449);
  EXPECT_EQ(code(read(file->objHandle(), range(3, 0))), -21449);
  EXPECT_EQ(code(read(file->objHandle(), range(10, 0))), -21449);
}

TEST_F(ObjectRequestsTest, HugeOffsetsDoNotWrapAround) {
  const auto file = makeFile("0123456789");
  constexpr auto most = std::numeric_limits<std::uint64_t>::max();
  for (const std::uint64_t offset : {most, most - 4, std::uint64_t{1} << 63}) {
    EXPECT_EQ(code(read(file->objHandle(), range(offset, 5))), -21449) << offset;
  }
  EXPECT_EQ(code(read(file->objHandle(), {{"OVReadOffset", std::int64_t{-1}}, {"OVReadLength", 1}})), -21449);
}

TEST_F(ObjectRequestsTest, FourMebibytesAreAllowedAndOneByteMoreIsNot) {
  const auto file = makeFile(std::string(4'194'304 + 10, 'x'));
  const Dictionary largest = read(file->objHandle(), range(0, 4'194'304));
  EXPECT_EQ(code(largest), 0);
  EXPECT_EQ(data(largest).size(), 4'194'304u);
  EXPECT_EQ(code(read(file->objHandle(), range(0, 4'194'305))), -21446);
}

TEST_F(ObjectRequestsTest, WithoutALengthTheWholeSizeIsAskedFor) {
  const auto file = makeFile("0123456789");
  EXPECT_EQ(data(read(file->objHandle(), {})), "0123456789");
  EXPECT_EQ(code(read(file->objHandle(), {{"OVReadOffset", 1}})), -21449);
  const auto large = makeFile(std::string(4'194'305, 'x'), "IMG_0002.JPG");
  EXPECT_EQ(code(read(large->objHandle(), {})), -21446);
}

TEST_F(ObjectRequestsTest, OptionsAreEchoedAndLargeDataIsAMemoryFile) {
  const auto file = makeFile(std::string(200'000, 'x'));
  const Dictionary small = read(file->objHandle(), {{"OVReadLength", 10}, {"mine", "kept"}});
  EXPECT_EQ(*small.string("mine"), "kept");
  EXPECT_EQ(small.signedInteger("OVReadLength"), 10);
  EXPECT_LT(small.data("OVReadData")->memfd(), 0);
  EXPECT_GE(read(file->objHandle(), range(0, 65'536)).data("OVReadData")->memfd(), 0);
}

TEST_F(ObjectRequestsTest, NumbersOfEveryTypeAreTaken) {
  const auto file = makeFile("0123456789");
  EXPECT_EQ(data(read(file->objHandle(), {{"OVReadOffset", 2.0}, {"OVReadLength", std::int32_t{3}}})), "234");
  EXPECT_EQ(data(read(file->objHandle(), {{"OVReadOffset", true}, {"OVReadLength", std::uint32_t{1}}})), "1");
}

TEST_F(ObjectRequestsTest, AnOptionThatIsNoNumberIsABadRange) {
  const auto file = makeFile("0123456789");
  const Dictionary result = read(file->objHandle(), {{"OVReadOffset", "three"}, {"OVReadLength", 1}});
  EXPECT_EQ(code(result), -21449);
  EXPECT_EQ(data(result), "");
}

TEST_F(ObjectRequestsTest, AnUnknownHandleAnswersAsEachRequestSays) {
  constexpr std::uint64_t unknown = 0xFFFF'FFFF'0000;
  EXPECT_EQ(code(read(unknown, range(0, 1))), -21449);
  EXPECT_EQ(
      code(answer([&](const auto& reply) { requests.requestMetadataForObjectHandle(unknown, {}, reply); })),
      -21450);
  EXPECT_EQ(code(answer([&](const auto& reply) {
              requests.requestThumbnailDataForObjectHandle(unknown, {}, reply);
            })),
            -21450);
  EXPECT_EQ(code(answer([&](const auto& reply) { requests.requestDeleteObjectHandle(unknown, {}, reply); })),
            0);
  EXPECT_EQ(code(read(unknown, {{"OVReadBufferStreamOpen", true}})), 0);
  EXPECT_EQ(code(read(unknown, {{"OVReadBufferStreamClose", true}})), 0);
}

TEST_F(ObjectRequestsTest, AFolderIsReadAsNothing) {
  test::makeFolder(card / "100ABCDE");
  const auto folder = BrivoFolder::initWithFSURL(card / "100ABCDE", "100ABCDE", nullptr, *device);
  index.addCameraFolderToIndex(folder);
  EXPECT_EQ(data(read(folder->objHandle(), range(0, 1))), "");
  EXPECT_EQ(code(read(folder->objHandle(), {{"OVReadBufferStreamOpen", true}})), 0);
}

TEST_F(ObjectRequestsTest, AnItemWithoutMetadataAnswersWithNothing) {
  const auto file = makeFile("x");
  EXPECT_TRUE(answer([&](const auto& reply) {
                requests.requestMetadataForObjectHandle(file->objHandle(), {}, reply);
              }).empty());
  EXPECT_TRUE(answer([&](const auto& reply) {
                requests.requestThumbnailDataForObjectHandle(file->objHandle(), {}, reply);
              }).empty());
}

TEST_F(ObjectRequestsTest, ADownloadIsAlwaysRefusedAndEchoesTheOptions) {
  const Dictionary result = answer([&](const auto& reply) {
    ObjectRequests::requestDownloadObjectHandle({{"mine", "kept"}}, reply);
  });
  EXPECT_EQ(result, (Dictionary{{"mine", "kept"}, {"errCode", std::int32_t{-9934}}}));
}

TEST_F(ObjectRequestsTest, DeletingALockedFileIsRefusedAndDeletingTwiceSucceeds) {
  const auto file = makeFile("x");
  const auto remove = [&] {
    return answer([&](const auto& reply) {
      requests.requestDeleteObjectHandle(file->objHandle(), {{"mine", 1}}, reply);
    });
  };
  device->locked = true;
  EXPECT_EQ(code(remove()), -9941);
  EXPECT_TRUE(std::filesystem::exists(card / "IMG_0001.JPG"));
  device->locked = false;
  const Dictionary result = remove();
  EXPECT_EQ(code(result), 0);
  EXPECT_EQ(result.signedInteger("mine"), 1);
  EXPECT_FALSE(std::filesystem::exists(card / "IMG_0001.JPG"));
  EXPECT_EQ(code(remove()), 0);
}

TEST_F(ObjectRequestsTest, AFileThatCannotBeOpenedIsAnEmptySuccess) {
  const auto file = makeFile("0123456789");
  std::filesystem::remove(card / "IMG_0001.JPG");
  for (const std::uint64_t length : {std::uint64_t{5}, std::uint64_t{10}}) {
    const Dictionary result = read(file->objHandle(), range(0, length));
    EXPECT_EQ(code(result), 0);
    EXPECT_EQ(data(result), "");
  }
  EXPECT_EQ(file->fileOpenCount(), 0u);
}

TEST_F(ObjectRequestsTest, AFileThatShrankGivesWhatIsLeft) {
  const auto file = makeFile(std::string(100'000, 'x'));
  std::filesystem::resize_file(card / "IMG_0001.JPG", 70'000);
  EXPECT_EQ(data(read(file->objHandle(), range(0, 100'000))).size(), 70'000u);
  EXPECT_EQ(data(read(file->objHandle(), range(69'990, 20))).size(), 10u);
  EXPECT_EQ(data(read(file->objHandle(), range(80'000, 10))).size(), 0u);
}

TEST_F(ObjectRequestsTest, OpenAndCloseAnswerWithoutTheOptions) {
  const auto file = makeFile("0123456789");
  const Dictionary expected{{"OVReadData", Data()}, {"errCode", std::int32_t{0}}};
  EXPECT_EQ(read(file->objHandle(), {{"OVReadBufferStreamOpen", true}, {"mine", 1}}), expected);
  EXPECT_EQ(file->fileOpenCount(), 1u);
  EXPECT_EQ(data(read(file->objHandle(), range(0, 10))), "0123456789");
  EXPECT_EQ(file->fileOpenCount(), 1u);
  EXPECT_EQ(read(file->objHandle(), {{"OVReadBufferStreamClose", true}}), expected);
  EXPECT_EQ(file->fileOpenCount(), 0u);
}

TEST_F(ObjectRequestsTest, PiecesOfAnOpenStreamComeReadAheadAsTheSlotsHoldThem) {
  const auto file = makeFile(std::string(kSlot, 'a') + std::string(kSlot, 'b') + "c");
  read(file->objHandle(), {{"OVReadBufferStreamOpen", true}});
  const Dictionary first = read(file->objHandle(), range(0, 10));
  EXPECT_EQ(data(first), std::string(kSlot, 'a')) << "a slot travels whole";
  EXPECT_GE(first.data("OVReadData")->memfd(), 0);
  EXPECT_EQ(data(read(file->objHandle(), range(kSlot, kSlot))), std::string(kSlot, 'b'));
  EXPECT_EQ(data(read(file->objHandle(), range(2 * kSlot, 1))), "c");
  EXPECT_EQ(code(read(file->objHandle(), range(2 * kSlot + 1, 1))), -21449);
}

TEST_F(ObjectRequestsTest, ASeekInAnOpenStreamIsAnEmptySuccessAndAfterTheCloseRangesAreReadDirectly) {
  const auto file = makeFile(std::string(3 * kSlot, 'a'));
  read(file->objHandle(), {{"OVReadBufferStreamOpen", true}});
  const Dictionary sought = read(file->objHandle(), range(kSlot + 1, 10));
  EXPECT_EQ(code(sought), 0);
  EXPECT_EQ(data(sought), "");
  EXPECT_EQ(data(read(file->objHandle(), range(0, kSlot))).size(), kSlot)
      << "the order can be taken up again";
  read(file->objHandle(), {{"OVReadBufferStreamClose", true}});
  EXPECT_EQ(data(read(file->objHandle(), range(kSlot + 1, 10))), std::string(10, 'a'));
}

TEST_F(ObjectRequestsTest, OpeningAgainBeginsAtTheBeginningAgain) {
  const auto file = makeFile(std::string(20 * kSlot, 'a'));
  for (int i = 0; i < 2; ++i) {
    read(file->objHandle(), {{"OVReadBufferStreamOpen", true}});
    EXPECT_EQ(data(read(file->objHandle(), range(0, kSlot))).size(), kSlot);
  }
  EXPECT_EQ(file->fileOpenCount(), 2u);
  read(file->objHandle(), {{"OVReadBufferStreamClose", true}});
  EXPECT_EQ(file->fileOpenCount(), 1u);
  EXPECT_EQ(file->bufferCache(), nullptr);
}

TEST_F(ObjectRequestsTest, MoreStreamsThanMayReadAheadAreReadDirectly) {
  std::vector<std::shared_ptr<BrivoFile>> files;
  for (int i = 0; i < 20; ++i) {
    files.push_back(makeFile("0123456789", "IMG_" + std::to_string(1000 + i) + ".JPG"));
    read(files.back()->objHandle(), {{"OVReadBufferStreamOpen", true}});
  }
  EXPECT_EQ(std::ranges::count_if(files, [](const auto& file) { return file->bufferCache() != nullptr; }),
            16);
  EXPECT_EQ(data(read(files.back()->objHandle(), range(3, 4))), "3456");
  requests.forgetClient(kClient);
  for (const auto& file : files) EXPECT_EQ(file->fileOpenCount(), 0u);
}

TEST_F(ObjectRequestsTest, AFileThatCannotBeOpenedAsAStreamAnswersWithNothing) {
  const auto file = makeFile("0123456789");
  std::filesystem::remove(card / "IMG_0001.JPG");
  EXPECT_EQ(code(read(file->objHandle(), {{"OVReadBufferStreamOpen", true}})), 0);
  const Dictionary result = read(file->objHandle(), range(0, 10));
  EXPECT_EQ(code(result), 0);
  EXPECT_EQ(data(result), "");
  EXPECT_EQ(data(read(file->objHandle(), range(0, 10))), "") << "and again, without waiting for ever";
}

TEST_F(ObjectRequestsTest, BothFlagsOpenAndThenClose) {
  const auto file = makeFile("x");
  read(file->objHandle(), {{"OVReadBufferStreamOpen", true}, {"OVReadBufferStreamClose", true}});
  EXPECT_EQ(file->fileOpenCount(), 0u);
  read(file->objHandle(),
       {{"OVReadBufferStreamOpen", false}, {"OVReadBufferStreamClose", false}, {"OVReadLength", 1}});
  EXPECT_EQ(file->fileOpenCount(), 0u);
}

TEST_F(ObjectRequestsTest, AClientClosesItsOwnStreamsOnly) {
  const auto file = makeFile("x");
  const Dictionary open{{"OVReadBufferStreamOpen", true}};
  const Dictionary close{{"OVReadBufferStreamClose", true}};
  read(file->objHandle(), open, 11);
  EXPECT_EQ(code(read(file->objHandle(), close, 12)), 0);
  EXPECT_EQ(file->fileOpenCount(), 1u) << "another client's close is none of ours";
  read(file->objHandle(), open, 11);
  read(file->objHandle(), close, 11);
  EXPECT_EQ(file->fileOpenCount(), 1u);
}

TEST_F(ObjectRequestsTest, AClientThatGoesLeavesNoStreamOpen) {
  const auto first = makeFile("x");
  const auto second = makeFile("y", "IMG_0002.JPG");
  const Dictionary open{{"OVReadBufferStreamOpen", true}};
  read(first->objHandle(), open, 11);
  read(first->objHandle(), open, 11);
  read(second->objHandle(), open, 11);
  read(second->objHandle(), open, 12);
  requests.forgetClient(11);
  EXPECT_EQ(first->fileOpenCount(), 0u);
  EXPECT_EQ(second->fileOpenCount(), 1u);
}

TEST_F(ObjectRequestsTest, ALentBufferIsFilledAndTheAnswerLeavesItOut) {
  const auto file = makeFile("0123456789");
  const auto buffer = SharedBuffer::create("test", 8);
  const Mapping memory = buffer->mapped(8);
  Dictionary options = range(3, 4);
  options.set("OVReadBuffer", *buffer);
  options.set("mine", "kept");
  const Dictionary expected{{"OVReadOffset", 3},    {"OVReadLength", 4},      {"mine", "kept"},
                            {"OVReadData", Data()}, {"OVReadBufferCount", 4}, {"errCode", 0}};
  const Dictionary result = read(file->objHandle(), options);
  EXPECT_FALSE(result.contains("OVReadBuffer"));
  EXPECT_EQ(describe(result), describe(expected));
  EXPECT_EQ(Data::copyOf(memory.bytes()).text(), std::string_view("3456\0\0\0\0", 8));
}

TEST_F(ObjectRequestsTest, ABufferThatWillNotDoIsABadRangeAndNothingIsTouched) {
  const auto file = makeFile("0123456789");
  const auto small = SharedBuffer::create("test", 3);
  const Mapping memory = small->mapped(3);
  for (const Value& buffer : {Value(*small), Value(SharedBuffer(UniqueFd(), 100)), Value(7), Value("text")}) {
    Dictionary options = range(0, 4);
    options.set("OVReadBuffer", buffer);
    const Dictionary result = read(file->objHandle(), options);
    EXPECT_EQ(code(result), -21449);
    EXPECT_EQ(result.unsignedInteger("OVReadBufferCount"), 0u);
    EXPECT_FALSE(result.contains("OVReadBuffer"));
  }
  EXPECT_EQ(memory.bytes()[0], std::byte{0});
}

TEST_F(ObjectRequestsTest, RangesIntoALentBufferObeyTheSameLimits) {
  const auto file = makeFile(std::string(4'194'310, 'x'));
  Dictionary options = range(0, 4'194'305);
  options.set("OVReadBuffer", *SharedBuffer::create("test", 8'000'000));
  EXPECT_EQ(code(read(file->objHandle(), options)), -21446);
  options.set("OVReadLength", 4'194'304);
  EXPECT_EQ(read(file->objHandle(), options).unsignedInteger("OVReadBufferCount"), 4'194'304u);
  options.set("OVReadOffset", 4'194'300);
  options.set("OVReadLength", 11);
  EXPECT_EQ(code(read(file->objHandle(), options)), -21449);
}

TEST_F(ObjectRequestsTest, AStreamThatIsOpenedWithABufferReadsNothingAhead) {
  const auto file = makeFile(std::string(100, 'x'));
  read(file->objHandle(),
       {{"OVReadBufferStreamOpen", true}, {"OVReadBuffer", *SharedBuffer::create("test", 8)}});
  EXPECT_EQ(file->fileOpenCount(), 1u);
  EXPECT_EQ(file->bufferCache(), nullptr);
  EXPECT_EQ(data(read(file->objHandle(), range(7, 5))), "xxxxx");
}

TEST_F(ObjectRequestsTest, ManyBuffersOfOneClientWorkInTurn) {
  const auto file = makeFile("0123456789");
  std::vector<SharedBuffer> buffers;
  for (int i = 0; i < 40; ++i) buffers.push_back(*SharedBuffer::create("test", 10));
  for (int round = 0; round < 2; ++round) {
    for (const SharedBuffer& buffer : buffers) {
      Dictionary options = range(0, 10);
      options.set("OVReadBuffer", buffer);
      EXPECT_EQ(read(file->objHandle(), options).unsignedInteger("OVReadBufferCount"), 10u);
      EXPECT_EQ(Data::copyOf(buffer.mapped(10).bytes()).text(), "0123456789");
    }
  }
}

TEST_F(ObjectRequestsTest, DeletingAFileClosesItsStreams) {
  const auto file = makeFile("0123456789");
  const auto other = makeFile("x", "IMG_0002.JPG");
  const Dictionary open{{"OVReadBufferStreamOpen", true}};
  read(file->objHandle(), open, 11);
  read(file->objHandle(), open, 12);
  read(file->objHandle(), open, 12);
  read(other->objHandle(), open, 12);
  answer([&](const auto& reply) { requests.requestDeleteObjectHandle(file->objHandle(), {}, reply); });
  EXPECT_EQ(file->fileOpenCount(), 0u);
  EXPECT_EQ(file->bufferCache(), nullptr);
  EXPECT_EQ(other->fileOpenCount(), 1u);
}

TEST_F(ObjectRequestsTest, ProgressIsToldToWhoeverWorksOnTheObject) {
  const auto file = makeFile("0123456789");
  const auto connection = std::make_shared<FakeConnection>(kClient);
  clients->addClientWithConnection(connection);
  read(file->objHandle(), range(0, 5));
  EXPECT_EQ(connection->sentCount(), 0u);
  clients->setClientUsingObjectHandle(kClient, file->objHandle());
  read(file->objHandle(), range(5, 3));
  ASSERT_EQ(connection->sentCount(), 1u);
  EXPECT_EQ(connection->note(0).unsignedInteger(keys::kDownloadedBytes), 8u);
  EXPECT_EQ(connection->note(0).real(keys::kDownloadedPercent), 80.0);
  read(file->objHandle(), range(50, 3));
  EXPECT_EQ(connection->sentCount(), 1u) << "nothing was delivered";
}

}  // namespace
}  // namespace brivo
