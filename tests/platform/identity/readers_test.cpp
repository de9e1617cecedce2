// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <string>

#include "platform/identity/process_facts.h"
#include "platform/identity/sandbox_labels.h"

namespace brivo {
namespace {

TEST(SandboxLabelsTest, TheFlatpakIdIsTheNameOfTheApplicationGroup) {
  EXPECT_EQ(
      applicationInFlatpakInfo("[Application]\nname=org.example.App\nruntime=x\n[Context]\nname=other\n"),
      "org.example.App");
  EXPECT_EQ(applicationInFlatpakInfo("[Runtime]\nname=org.example.Runtime\n"), std::nullopt);
  EXPECT_EQ(applicationInFlatpakInfo("[Application]\nname=\n"), std::nullopt);
  EXPECT_EQ(applicationInFlatpakInfo(""), std::nullopt);
}

TEST(SandboxLabelsTest, TheSnapIsTheSecondPartOfItsLabel) {
  EXPECT_EQ(snapInSecurityLabel("snap.camera-app.import (enforce)"), "camera-app");
  EXPECT_EQ(snapInSecurityLabel("unconfined"), std::nullopt);
  EXPECT_EQ(snapInSecurityLabel("snap."), std::nullopt);
  EXPECT_EQ(snapInSecurityLabel("snap..x"), std::nullopt);
  EXPECT_EQ(snapInSecurityLabel(""), std::nullopt);
}

TEST(SandboxLabelsTest, ANameThatNoApplicationHasIsNone) {
  const auto nameIs = [](const std::string& name) {
    return applicationInFlatpakInfo("[Application]\nname=" + name + "\nruntime=x\n").has_value();
  };
  EXPECT_TRUE(nameIs("org.example.Photo-App_2"));
  EXPECT_TRUE(nameIs("org." + std::string(251, 'a')));
  EXPECT_FALSE(nameIs("org." + std::string(252, 'a')));
  for (const char* odd :
       {"photos", ".org.example", "org.example.", "org..example", "org.example/x", "/usr/bin/a.b",
        " org.example.A", "org.example.A\r", "org.example.\xC3\xA9", "org.example.A B"}) {
    EXPECT_FALSE(nameIs(odd)) << odd;
  }
}

TEST(ProcessFactsTest, AnEndedProcessHasNoIdentifierInFdinfo) {
  EXPECT_EQ(processInFdinfo("pos:\t0\nflags:\t02000002\nPid:\t1234\nNSpid:\t1234\n"), 1234);
  for (const char* none : {"pos:\t0\nPid:\t-1\n", "Pid:\t0\n", "Pid:", "Pid:\t12x\n", "NSpid:\t7\n",
                           "Pid:\t99999999999\n", ""}) {
    EXPECT_EQ(processInFdinfo(none), std::nullopt) << none;
  }
}

TEST(ProcessFactsTest, TheStartTimeComesAfterAnyName) {
  const std::string rest = " 1 7 7 0 -1 4194560 100 0 0 0 1 2 0 0 20 0 1 0 98765 1000 10\n";
  EXPECT_EQ(startTimeInStat("7 (name) S" + rest), 98765u);
  EXPECT_EQ(startTimeInStat("7 (a) R 1 2) (3) S" + rest), 98765u);
  EXPECT_EQ(startTimeInStat("7 (new\nline) t" + rest), 98765u);
  EXPECT_EQ(startTimeInStat("7 (name) Z" + rest), std::nullopt);
  EXPECT_EQ(startTimeInStat("7 (name) X" + rest), std::nullopt);
  for (const char* bad : {"", "7", "7 (name", "7 (name)", "7 (name) ", "7 (name) S 1 2 3", ") ) ) "}) {
    EXPECT_EQ(startTimeInStat(bad), std::nullopt) << bad;
  }
}

}  // namespace
}  // namespace brivo
