// SPDX-License-Identifier: MIT
#include "orvidcore/catalogue.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <future>

#include "protocol/result_codes.h"
#include "ptp/object_info_dataset.h"

namespace orvid {
namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;
using Clock = std::chrono::steady_clock;

brivo::Data dataset(std::uint32_t handle, std::uint32_t parent, const std::string& name, bool isFolder) {
  brivo::MSObjectInfoDataset dataset;
  dataset.setObjectHandle(handle);
  dataset.setParentObject(parent);
  dataset.setFilename(name);
  dataset.setAssociationType(isFolder ? 1 : 0);
  return dataset.content();
}

class CatalogueTest : public testing::Test {
 protected:
  std::vector<ObjectInfo> addFolder(std::uint32_t handle, std::uint32_t parent, const std::string& name) {
    return catalogue.add({dataset(handle, parent, name, true)});
  }
  std::vector<ObjectInfo> addFile(std::uint32_t handle, std::uint32_t parent, const std::string& name) {
    return catalogue.add({dataset(handle, parent, name, false)});
  }
  std::vector<std::string> paths() const {
    std::vector<std::string> paths;
    for (const ObjectInfo& info : catalogue.all()) paths.push_back(info.path);
    return paths;
  }

  Catalogue catalogue;
};

TEST_F(CatalogueTest, PathsBeginAtTheTopLevel) {
  addFolder(1, brivo::kTopLevelParent, "DCIM");
  addFolder(2, 1, "100ABCDE");
  EXPECT_THAT(addFile(3, 2, "IMG_0001.JPG"),
              ElementsAre(testing::Field(&ObjectInfo::path, "DCIM/100ABCDE/IMG_0001.JPG")));
  EXPECT_THAT(paths(), ElementsAre("DCIM", "DCIM/100ABCDE", "DCIM/100ABCDE/IMG_0001.JPG"));
}

TEST_F(CatalogueTest, AFolderThatArrivesAfterWhatItHoldsCompletesThePaths) {
  EXPECT_THAT(addFile(3, 2, "IMG_0001.JPG"), ElementsAre(testing::Field(&ObjectInfo::path, "IMG_0001.JPG")));
  addFolder(2, 1, "100ABCDE");
  addFolder(1, brivo::kTopLevelParent, "DCIM");
  EXPECT_THAT(paths(), ElementsAre("DCIM", "DCIM/100ABCDE", "DCIM/100ABCDE/IMG_0001.JPG"));
  EXPECT_EQ(catalogue.find(3)->path, "DCIM/100ABCDE/IMG_0001.JPG");
}

TEST_F(CatalogueTest, AFolderThatContainsItselfHasAPathWithAnEnd) {
  addFolder(1, 2, "A");
  addFolder(2, 1, "B");
  EXPECT_THAT(addFile(3, 1, "IMG_0001.JPG"), SizeIs(1));
  EXPECT_LT(catalogue.find(3)->path.size(), 200u);
}

TEST_F(CatalogueTest, WhatIsNoCompleteDatasetIsLeftOutAndTheRestStays) {
  const auto whole = dataset(7, brivo::kTopLevelParent, "DCIM", true);
  const auto cut = brivo::Data::copyOf(whole.bytes().first(60));
  const auto added = catalogue.add({cut, "text", brivo::Data(), whole});
  EXPECT_THAT(added, ElementsAre(testing::Field(&ObjectInfo::handle, 7u)));
  EXPECT_THAT(paths(), ElementsAre("DCIM"));
}

TEST_F(CatalogueTest, TheSameHandleTwiceIsOneObject) {
  addFile(3, brivo::kTopLevelParent, "OLD");
  addFile(3, brivo::kTopLevelParent, "NEW");
  EXPECT_THAT(paths(), ElementsAre("NEW"));
}

TEST_F(CatalogueTest, ARemovedObjectIsForgotten) {
  addFile(3, brivo::kTopLevelParent, "IMG_0001.JPG");
  catalogue.remove(3);
  catalogue.remove(4);
  EXPECT_THAT(paths(), IsEmpty());
  EXPECT_FALSE(catalogue.find(3));
}

TEST_F(CatalogueTest, ItSettlesAtOnceWhenAllThatWereCountedAreThere) {
  catalogue.ready(2);
  addFolder(1, brivo::kTopLevelParent, "DCIM");
  addFolder(2, 1, "100ABCDE");
  const auto begin = Clock::now();
  EXPECT_EQ(catalogue.waitUntilSettled(20s), Catalogue::Wait::settled);
  EXPECT_LT(Clock::now() - begin, Catalogue::kQuietTime);
}

TEST_F(CatalogueTest, ItSettlesWhenTheLastOneArrivesWhileSomebodyWaits) {
  catalogue.ready(1);
  auto settled = std::async(std::launch::async, [&] { return catalogue.waitUntilSettled(20s); });
  EXPECT_EQ(settled.wait_for(20ms), std::future_status::timeout);
  addFolder(1, brivo::kTopLevelParent, "DCIM");
  EXPECT_EQ(settled.get(), Catalogue::Wait::settled);
}

TEST_F(CatalogueTest, WithFewerThanCountedItSettlesAfterTheQuietTimeSinceTheLastArrival) {
  catalogue.ready(9);
  addFolder(1, brivo::kTopLevelParent, "DCIM");
  const auto begin = Clock::now();
  EXPECT_EQ(catalogue.waitUntilSettled(20s), Catalogue::Wait::settled);
  const auto took = Clock::now() - begin;
  EXPECT_GE(took, Catalogue::kQuietTime - 50ms);
  EXPECT_LT(took, 10s);
}

TEST_F(CatalogueTest, BeforeItWasCountedNothingSettlesIt) {
  addFolder(1, brivo::kTopLevelParent, "DCIM");
  EXPECT_EQ(catalogue.waitUntilSettled(Catalogue::kQuietTime + 100ms), Catalogue::Wait::tooLong);
}

TEST_F(CatalogueTest, ANegativeCountIsNone) {
  catalogue.ready(-1);
  EXPECT_EQ(catalogue.waitUntilSettled(0ms), Catalogue::Wait::settled);
  EXPECT_THAT(paths(), IsEmpty());
}

TEST_F(CatalogueTest, ClosingEndsTheWait) {
  catalogue.ready(9);
  auto settled = std::async(std::launch::async, [&] { return catalogue.waitUntilSettled(20s); });
  const auto begin = Clock::now();
  catalogue.close();
  EXPECT_EQ(settled.get(), Catalogue::Wait::closed);
  EXPECT_LT(Clock::now() - begin, Catalogue::kQuietTime);
}

}  // namespace
}  // namespace orvid
