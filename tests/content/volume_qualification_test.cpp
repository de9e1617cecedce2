// SPDX-License-Identifier: MIT
#include "content/volume_qualification.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/standard_error.h"
#include "support/temporary_folder.h"

namespace brivo {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

Dictionary matchingList(const std::optional<Array>& volumeInfo) {
  Dictionary entry{{"class", "BrivoDeviceManager"}};
  if (volumeInfo) entry.set("volumeInfo", *volumeInfo);
  return {
      {"cameraClasses", Array{Dictionary{{"class", "Other"}, {"volumeInfo", Array{"X"}}}, std::move(entry)}}};
}

class VolumeQualificationTest : public testing::Test {
 protected:
  bool qualifies(const std::optional<Dictionary>& list) {
    return IsSupportedMassStorageCameraVolume(card.path(), &mediaPaths, list, systemFiles());
  }

  test::TemporaryFolder card;
  std::vector<std::string> mediaPaths{"left from before"};
};

TEST_F(VolumeQualificationTest, ADcimThatIsAFileYieldsFalseAndAnEmptyList) {
  test::writeFile(card / "DCIM", "");
  EXPECT_FALSE(qualifies(matchingList(Array{"DCIM"})));
  EXPECT_THAT(mediaPaths, IsEmpty());
}

TEST_F(VolumeQualificationTest, OfTwoListedNamesTheOneThatExistsIsTaken) {
  test::makeFolder(card / "MP_ROOT");
  EXPECT_TRUE(qualifies(matchingList(Array{"DCIM", "MP_ROOT"})));
  EXPECT_THAT(mediaPaths, ElementsAre("MP_ROOT"));
}

TEST_F(VolumeQualificationTest, FoldersComeInListOrder) {
  test::makeFolder(card / "DCIM");
  test::makeFolder(card / "MP_ROOT");
  EXPECT_TRUE(qualifies(matchingList(Array{"MP_ROOT", "DCIM"})));
  EXPECT_THAT(mediaPaths, ElementsAre("MP_ROOT", "DCIM"));
}

TEST_F(VolumeQualificationTest, AnEmptyListOfNamesYieldsFalse) {
  test::makeFolder(card / "DCIM");
  EXPECT_FALSE(qualifies(matchingList(Array{})));
}

TEST_F(VolumeQualificationTest, DcimIsTheDefaultWhenTheKeyOrTheClassIsAbsent) {
  test::makeFolder(card / "DCIM");
  EXPECT_TRUE(qualifies(matchingList(std::nullopt)));
  EXPECT_THAT(mediaPaths, ElementsAre("DCIM"));
  EXPECT_TRUE(qualifies(Dictionary{}));
  EXPECT_THAT(mediaPaths, ElementsAre("DCIM"));
}

TEST_F(VolumeQualificationTest, AnAbsentListYieldsFalseEvenWithADcim) {
  test::makeFolder(card / "DCIM");
  const test::StandardErrorCapture log;
  EXPECT_FALSE(qualifies(std::nullopt));
  EXPECT_THAT(mediaPaths, IsEmpty());
  EXPECT_THAT(log.text(), HasSubstr("          matchPlist ! ⚠️⚠️⚠️⚠️⚠️⚠️ - Missing"));
}

TEST_F(VolumeQualificationTest, NamesAreTakenAsGivenWithoutCaseFolding) {
  test::makeFolder(card / "dcim");
  EXPECT_FALSE(qualifies(matchingList(Array{"DCIM"})));
}

TEST_F(VolumeQualificationTest, MissingArgumentsAreLogged) {
  test::makeFolder(card / "DCIM");
  const test::StandardErrorCapture log;
  EXPECT_FALSE(IsSupportedMassStorageCameraVolume(std::nullopt, &mediaPaths, Dictionary{}, systemFiles()));
  EXPECT_THAT(log.text(), HasSubstr("              volume ! ⚠️⚠️⚠️⚠️⚠️⚠️ - Missing"));
  EXPECT_TRUE(IsSupportedMassStorageCameraVolume(card.path(), nullptr, Dictionary{}, systemFiles()));
  EXPECT_THAT(log.text(), HasSubstr("          mediaPaths ! ⚠️⚠️⚠️⚠️⚠️⚠️ - Missing"));
  EXPECT_THAT(log.text(), HasSubstr("<5>                     | " + card.path() + "\n"));
}

TEST_F(VolumeQualificationTest, AListOfOtherTypesIsReadAsFarAsItMakesSense) {
  test::makeFolder(card / "DCIM");
  EXPECT_TRUE(qualifies(Dictionary{{"cameraClasses", "none"}}));
  EXPECT_TRUE(qualifies(Dictionary{{"cameraClasses", Array{1, "x", Dictionary{{"class", 7}}}}}));
  EXPECT_TRUE(qualifies(matchingList(Array{1, "DCIM", Dictionary{}})));
  EXPECT_THAT(mediaPaths, ElementsAre("DCIM"));
}

}  // namespace
}  // namespace brivo
