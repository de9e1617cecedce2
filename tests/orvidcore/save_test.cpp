// SPDX-License-Identifier: MIT
#include <gmock/gmock.h>

#include <filesystem>
#include <fstream>

#include "orvidcore/client_test.h"
#include "support/file_size_limit.h"

namespace orvid::test {
namespace {

namespace fs = std::filesystem;

using brivo::test::makeFolder;
using brivo::test::readFile;
using brivo::test::writeFile;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::size_t kNineMegabytes = 9'000'000;

class SaveTest : public ClientTest {
 protected:
  SaveTest() { makeFolder(folder); }

  /// Everything in the target folder, hidden files too.
  std::vector<std::string> saved() const {
    std::vector<std::string> names;
    for (const auto& entry : fs::directory_iterator(folder)) names.push_back(entry.path().filename());
    return names;
  }

  const std::string folder = service.besides("saved");
  const std::string target = folder + "/picture";
};

TEST_F(SaveTest, TheWholeContentIsSaved) {
  const std::string content = pattern(kNineMegabytes);
  const auto saving = onlyFile(content).save(target);
  ASSERT_TRUE(saving.ok()) << saving.error().text;
  EXPECT_TRUE(readFile(target) == content);
  EXPECT_THAT(saved(), ElementsAre("picture"));
}

TEST_F(SaveTest, AnEmptyFileIsSavedAsOne) {
  const auto saving = onlyFile("").save(target);
  ASSERT_TRUE(saving.ok()) << saving.error().text;
  EXPECT_THAT(saved(), ElementsAre("picture"));
  EXPECT_EQ(fs::file_size(target), 0u);
}

TEST_F(SaveTest, ProgressGrowsToTheWholeSize) {
  const Object object = onlyFile(pattern(kNineMegabytes));
  std::vector<std::uint64_t> steps;
  const auto saving = object.save(target, [&](std::uint64_t bytes, std::uint64_t size) {
    EXPECT_EQ(size, kNineMegabytes);
    EXPECT_FALSE(fs::exists(target)) << "it appears when it is whole";
    steps.push_back(bytes);
    return true;
  });
  ASSERT_TRUE(saving.ok()) << saving.error().text;
  EXPECT_GT(steps.size(), 2u) << "one read holds at most 4 MiB";
  EXPECT_TRUE(std::ranges::is_sorted(steps));
  EXPECT_EQ(steps.back(), kNineMegabytes);
}

TEST_F(SaveTest, ProgressCanStopItAndNothingIsLeft) {
  const Object object = onlyFile(pattern(kNineMegabytes));
  int calls = 0;
  const auto saving = object.save(target, [&](std::uint64_t, std::uint64_t) { return ++calls < 2; });
  EXPECT_FALSE(saving.ok());
  EXPECT_EQ(calls, 2);
  EXPECT_THAT(saved(), IsEmpty());
}

TEST_F(SaveTest, AStoppedSaveLeavesTheOldFileAsItWas) {
  writeFile(target, "old");
  const Object object = onlyFile(pattern(kNineMegabytes));
  EXPECT_FALSE(object.save(target, [](std::uint64_t, std::uint64_t) { return false; }).ok());
  EXPECT_THAT(saved(), ElementsAre("picture"));
  EXPECT_EQ(readFile(target), "old");
}

TEST_F(SaveTest, AnExistingFileIsReplaced) {
  writeFile(target, "a longer old content");
  ASSERT_TRUE(onlyFile("new").save(target).ok());
  EXPECT_EQ(readFile(target), "new");
  EXPECT_THAT(saved(), ElementsAre("picture"));
}

TEST_F(SaveTest, AMissingFolderIsAnErrorOfTheFile) {
  const auto saving = onlyFile("x").save(folder + "/none/picture");
  EXPECT_EQ(kindOf(saving), ErrorKind::file);
  EXPECT_THAT(saving.error().text, testing::HasSubstr("No such file or directory"));
  EXPECT_THAT(saved(), IsEmpty());
}

TEST_F(SaveTest, AFolderInTheWayIsAnErrorOfTheFileAndNoTemporaryFileStays) {
  makeFolder(target);
  EXPECT_EQ(kindOf(onlyFile("x").save(target)), ErrorKind::file);
  EXPECT_THAT(saved(), ElementsAre("picture"));
  EXPECT_TRUE(fs::is_directory(target));
}

TEST_F(SaveTest, AFileThatVanishedFromTheCardIsAnErrorAndNothingIsLeft) {
  const Object object = onlyFile("0123456789");
  fs::remove(service.card("CARD") + "/DCIM/100ABCDE/IMG_0001.JPG");
  EXPECT_FALSE(object.save(target).ok());
  EXPECT_THAT(saved(), IsEmpty());
}

TEST_F(SaveTest, AFileThatGrewShorterIsNotSavedInPart) {
  const Object object = onlyFile(pattern(kNineMegabytes));
  fs::resize_file(service.card("CARD") + "/DCIM/100ABCDE/IMG_0001.JPG", 3'000'000);
  EXPECT_FALSE(object.save(target).ok());
  EXPECT_THAT(saved(), IsEmpty());
}

TEST_F(SaveTest, SavingAsynchronouslyGivesTheSameFileAndProgress) {
  const std::string content = pattern(kNineMegabytes);
  const Object object = onlyFile(content);
  std::atomic<std::uint64_t> progress = 0;
  Outcome<Done> done;
  object.saveAsync(target, done.callback(), [&](std::uint64_t bytes, std::uint64_t) {
    progress = bytes;
    return true;
  });
  const auto saving = done.get();
  ASSERT_TRUE(saving.ok()) << saving.error().text;
  EXPECT_TRUE(readFile(target) == content);
  EXPECT_EQ(progress, kNineMegabytes);
}

TEST_F(SaveTest, SavingAsynchronouslyCanBeStoppedAndCanFail) {
  const Object object = onlyFile(pattern(kNineMegabytes));
  Outcome<Done> stopped;
  object.saveAsync(target, stopped.callback(), [](std::uint64_t, std::uint64_t) { return false; });
  EXPECT_FALSE(stopped.get().ok());
  Outcome<Done> nowhere;
  object.saveAsync(folder + "/none/picture", nowhere.callback());
  EXPECT_EQ(kindOf(nowhere.get()), ErrorKind::file);
  EXPECT_THAT(saved(), IsEmpty());
}

TEST_F(SaveTest, SeveralSavesAtOnceDoNotDisturbEachOther) {
  const std::string content = pattern(kNineMegabytes);
  const Object object = onlyFile(content);
  std::vector<Outcome<Done>> outcomes(6);
  for (std::size_t i = 0; i < outcomes.size(); ++i) {
    object.saveAsync(target + std::to_string(i), outcomes[i].callback());
  }
  for (std::size_t i = 0; i < outcomes.size(); ++i) {
    EXPECT_TRUE(outcomes[i].get().ok());
    EXPECT_TRUE(readFile(target + std::to_string(i)) == content) << i;
  }
}

TEST_F(SaveTest, ACardThatGoesDuringASaveEndsItAndNothingIsLeft) {
  const Object object = onlyFile(pattern(kNineMegabytes));
  DeviceEvents events;
  events.onClosed = [&] { told.add("closed"); };
  device->setEvents(std::move(events));
  const auto saving = object.save(target, [&](std::uint64_t bytes, std::uint64_t) {
    if (bytes < 3'000'000) service.removeCard("CARD");
    return told.waitFor("closed");
  });
  EXPECT_EQ(kindOf(saving), ErrorKind::disconnected);
  EXPECT_THAT(saved(), IsEmpty());
}

/// Larger than what is thrown away.
constexpr std::size_t kFortyMegabytes = 40'000'000;

/// A save that the end of the card cuts short, and the card put in again with the same file.
class InterruptedSaveTest : public SaveTest {
 protected:
  Object interrupted() {
    const Object object = cardOfOneTime(content);
    DeviceEvents events;
    events.onClosed = [&] { told.add("closed"); };
    device->setEvents(std::move(events));
    const auto saving = object.save(target, [&](std::uint64_t bytes, std::uint64_t) {
      if (bytes < 20'000'000) return true;
      if (fs::exists(service.card("CARD"))) service.removeCard("CARD");
      return told.waitFor("closed");
    });
    EXPECT_EQ(kindOf(saving), ErrorKind::disconnected);
    EXPECT_FALSE(fs::exists(target));
    return object;
  }
  /// The object of a card that is put in with this content, of the same size and time as before.
  Object again(std::string_view newContent) {
    waitUntil([&] { return browser->devices()->empty(); });
    device = nullptr;
    return cardOfOneTime(newContent);
  }
  /// A card with one file, which is always of the same time.
  Object cardOfOneTime(std::string_view newContent) {
    const std::string path = service.addFile("CARD", "100ABCDE/IMG_0001.JPG", newContent);
    fs::last_write_time(path, fs::file_time_type{});
    return named(catalogueOfCard(), "IMG_0001.JPG");
  }
  /// How many bytes a save transfers.
  std::uint64_t transferred(const Object& object) const {
    std::uint64_t first = 0;
    const auto saving = object.save(target, [&](std::uint64_t bytes, std::uint64_t) {
      if (first == 0) first = bytes;
      return true;
    });
    EXPECT_TRUE(saving.ok()) << saving.error().text;
    return object.info().size - first;
  }
  const std::string content = pattern(kFortyMegabytes);
};

TEST_F(InterruptedSaveTest, ALargeSaveIsGoneOnWithWhenTheCardIsBack) {
  interrupted();
  ASSERT_EQ(saved().size(), 1u) << "what was saved stays, hidden";
  EXPECT_TRUE(saved().front().starts_with("."));
  EXPECT_LT(transferred(again(content)), 25'000'000u);
  EXPECT_TRUE(readFile(target) == content);
  EXPECT_THAT(saved(), ElementsAre("picture"));
}

TEST_F(InterruptedSaveTest, WhatIsThereOfAnotherContentIsNotGoneOnWith) {
  interrupted();
  const std::string other(kFortyMegabytes, 'x');
  const Object object = again(other);
  EXPECT_TRUE(object.save(target).ok());
  EXPECT_TRUE(readFile(target) == other);
}

TEST_F(SaveTest, TheSameTargetTwiceAtOnceIsRefusedOnce) {
  const Object object = onlyFile(pattern(kNineMegabytes));
  std::optional<ErrorKind> second;
  const auto first = object.save(target, [&](std::uint64_t, std::uint64_t) {
    if (!second) second = kindOf(object.save(target));
    return true;
  });
  EXPECT_TRUE(first.ok());
  EXPECT_EQ(second, ErrorKind::file);
  EXPECT_THAT(saved(), ElementsAre("picture"));
}

TEST_F(SaveTest, StreamingGivesEveryByteInOrderFromAnyOffsetOn) {
  const std::string content = pattern(kNineMegabytes);
  const Object object = onlyFile(content);
  for (const std::uint64_t offset : {std::uint64_t{0}, std::uint64_t{1}, std::uint64_t{kNineMegabytes}}) {
    std::string streamed;
    const auto result = object.stream(offset, [&](std::span<const std::byte> piece) {
      streamed.append(reinterpret_cast<const char*>(piece.data()), piece.size());
      return true;
    });
    EXPECT_TRUE(result.ok());
    EXPECT_TRUE(streamed == content.substr(offset)) << offset;
  }
  const auto beyond = object.stream(kNineMegabytes + 1, [](auto) { return true; });
  EXPECT_EQ(codeOf(beyond), -21449);
}

TEST_F(SaveTest, AStreamThatIsToldToStopIsDoneAndAnotherWorks) {
  const Object object = onlyFile(pattern(kNineMegabytes));
  for (int i = 0; i < 3; ++i) {
    int pieces = 0;
    EXPECT_TRUE(object.stream(0, [&](auto) { return ++pieces < 2; }).ok());
    EXPECT_EQ(pieces, 2);
  }
}

TEST_F(SaveTest, AFileThatShrinksDuringASaveIsAnErrorAndNothingIsLeft) {
  const Object object = onlyFile(pattern(kNineMegabytes));
  const auto saving = object.save(target, [&](std::uint64_t, std::uint64_t) {
    fs::resize_file(service.card("CARD") + "/DCIM/100ABCDE/IMG_0001.JPG", 5'000'001);
    return true;
  });
  EXPECT_FALSE(saving.ok());
  EXPECT_THAT(saved(), IsEmpty());
}

TEST_F(SaveTest, AStreamGoesOnBehindAPieceThatCameShort) {
  const std::string content = pattern(kNineMegabytes);
  const Object object = onlyFile(content);
  const std::string path = service.card("CARD") + "/DCIM/100ABCDE/IMG_0001.JPG";
  constexpr std::size_t kEnd = 3'000'000;
  fs::resize_file(path, kEnd);
  std::string streamed;
  const auto result = object.stream(0, [&](std::span<const std::byte> piece) {
    streamed.append(reinterpret_cast<const char*>(piece.data()), piece.size());
    if (streamed.size() == kEnd) {  // the rest is there again
      std::fstream file(path, std::ios::in | std::ios::out | std::ios::binary);
      file.seekp(kEnd).write(content.data() + kEnd, static_cast<std::streamsize>(content.size() - kEnd));
    }
    return true;
  });
  EXPECT_TRUE(result.ok());
  EXPECT_TRUE(streamed == content);
}

TEST_F(SaveTest, WithoutMemoryToLendTheServiceReadsAhead) {
  const std::string content = pattern(kNineMegabytes);
  const Object object = onlyFile(content);
  std::string streamed;
  const brivo::test::FileSizeLimit limit(1'000'000);
  const auto result = object.stream(0, [&](std::span<const std::byte> piece) {
    streamed.append(reinterpret_cast<const char*>(piece.data()), piece.size());
    return true;
  });
  EXPECT_TRUE(result.ok());
  EXPECT_TRUE(streamed == content);
}

}  // namespace
}  // namespace orvid::test
