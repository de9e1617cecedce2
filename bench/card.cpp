// SPDX-License-Identifier: MIT
#include "card.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstdio>
#include <filesystem>
#include <stdexcept>

#include "platform/base/unique_fd.h"

namespace brivo::bench {

namespace {

constexpr std::size_t kFilesPerFolder = 999;
constexpr std::size_t kFirstFolder = 100;
constexpr std::size_t kMediaRoots = 1;

constexpr std::size_t kBlock = 1'048'576;

std::size_t folderCount(std::size_t files) { return (files + kFilesPerFolder - 1) / kFilesPerFolder; }

std::string folder(std::size_t index) { return "/DCIM/" + std::to_string(kFirstFolder + index) + "ABCDE"; }

UniqueFd created(const std::string& path) {
  UniqueFd file(::open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600));
  if (!file) throw std::runtime_error("cannot make " + path);
  return file;
}

}  // namespace

FileMaker ofBytes(std::uint64_t size) {
  return [size](const std::string& path) {
    const UniqueFd file = created(path);
    const std::string block(kBlock, '.');
    for (std::uint64_t left = size; left > 0;) {
      const ssize_t written = ::write(file.get(), block.data(), std::min<std::uint64_t>(left, kBlock));
      if (written <= 0) throw std::runtime_error("cannot write " + path);
      left -= static_cast<std::uint64_t>(written);
    }
    ::fdatasync(file.get());
  };
}

FileMaker ofNothing(std::uint64_t size) {
  return [size](const std::string& path) {
    if (::ftruncate(created(path).get(), static_cast<off_t>(size)) != 0) {
      throw std::runtime_error("cannot make " + path + " so large");
    }
  };
}

FileMaker asLinkTo(const std::string& file) {
  return [file](const std::string& path) {
    std::error_code error;
    std::filesystem::create_hard_link(file, path, error);
    if (error) throw std::runtime_error("cannot link " + path + " to " + file + ": " + error.message());
  };
}

Card::Card(std::size_t files, const std::string& content, const std::string& extension)
    : Card(
          files, [&](const std::string& path) { test::writeFile(path, content); }, extension) {}

Card::Card(std::size_t files, const FileMaker& make, const std::string& extension)
    : path_(volumes_ / "CARD"), files_(files), extension_(extension) {
  for (std::size_t i = 0; i < files; ++i) {
    const std::string path = path_ + folder(i / kFilesPerFolder);
    const std::size_t inFolder = i % kFilesPerFolder;
    if (inFolder == 0) test::makeFolder(path);
    make(path + "/" + fileName(inFolder));
  }
}

std::string Card::firstFolder() { return folder(0); }

std::string Card::fileName(std::size_t index) const {
  std::array<char, 32> text{};
  std::snprintf(text.data(), text.size(), "IMG_%04zu.", index + 1);
  return text.data() + extension_;
}

std::size_t Card::objects() const { return kMediaRoots + folderCount(files_) + files_; }

}  // namespace brivo::bench
