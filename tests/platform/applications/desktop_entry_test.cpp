// SPDX-License-Identifier: MIT
#include "platform/applications/desktop_entry.h"

#include <gtest/gtest.h>

namespace brivo {
namespace {

std::string program(const std::string& lines) {
  const auto entry = parseDesktopEntry("[Desktop Entry]\nType=Application\n" + lines);
  return entry ? entry->program : "(none)";
}

TEST(DesktopEntryTest, TheProgramIsTheFirstWordOfExec) {
  EXPECT_EQ(program("Exec=/usr/bin/photos %U\n"), "/usr/bin/photos");
  EXPECT_EQ(program("Exec=photos\n"), "photos");
  EXPECT_EQ(program("  Exec = photos --import %f\r\n"), "photos");
  EXPECT_EQ(program("Exec=\"/opt/My Photos/run\" %U\n"), "/opt/My Photos/run");
  EXPECT_EQ(program("Exec=\"/opt/a\\\\\"b\\\\$c\"\n"), "/opt/a\"b$c");
  EXPECT_EQ(program("Exec=/opt/a\\sb\n"), "/opt/a");
}

TEST(DesktopEntryTest, OnlyTheMainGroupCounts) {
  EXPECT_EQ(program("Exec=photos\n[Desktop Action new]\nExec=other\n"), "photos");
  EXPECT_FALSE(parseDesktopEntry("[Other]\nType=Application\nExec=x\n"));
}

TEST(DesktopEntryTest, WhatIsNoApplicationIsNone) {
  EXPECT_FALSE(parseDesktopEntry("[Desktop Entry]\nType=Link\nExec=x\n"));
  EXPECT_FALSE(parseDesktopEntry("[Desktop Entry]\nExec=x\n"));
  EXPECT_EQ(program("Exec=x\nHidden=true\n"), "(none)");
  EXPECT_EQ(program("Exec=\n"), "(none)");
  EXPECT_EQ(program("Exec=\"\"\n"), "(none)");
  for (const char* bad : {"", "\n\n", "[", "[Desktop Entry]", "\xFF\xFE", "=\n=", "Exec"}) {
    EXPECT_FALSE(parseDesktopEntry(bad)) << bad;
  }
}

}  // namespace
}  // namespace brivo
