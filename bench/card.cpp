// SPDX-License-Identifier: MIT
#include "card.h"

#include <algorithm>
#include <array>
#include <cstdio>

namespace brivo::bench {

namespace {

constexpr std::size_t kFilesPerFolder = 999;
constexpr std::size_t kFirstFolder = 100;
constexpr std::size_t kMediaRoots = 1;

std::size_t folderCount(std::size_t files) { return (files + kFilesPerFolder - 1) / kFilesPerFolder; }

void fillFolder(const std::string& folder, std::size_t files, const std::string& content) {
  for (std::size_t i = 1; i <= files; ++i) {
    std::array<char, 32> name{};
    std::snprintf(name.data(), name.size(), "/IMG_%04zu.JPG", i);
    test::writeFile(folder + name.data(), content);
  }
}

}  // namespace

Card::Card(std::size_t files, const std::string& content) : path_(volumes_ / "CARD"), files_(files) {
  for (std::size_t made = 0; made < files; made += kFilesPerFolder) {
    const std::string number = std::to_string(kFirstFolder + made / kFilesPerFolder);
    fillFolder(path_ + "/DCIM/" + number + "ABCDE", std::min(kFilesPerFolder, files - made), content);
  }
}

std::size_t Card::objects() const { return kMediaRoots + folderCount(files_) + files_; }

}  // namespace brivo::bench
