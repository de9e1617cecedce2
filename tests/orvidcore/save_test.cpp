// SPDX-License-Identifier: MIT
#include <gmock/gmock.h>

#include <filesystem>

#include "orvidcore/client_test.h"

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

}  // namespace
}  // namespace orvid::test
