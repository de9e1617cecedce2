// SPDX-License-Identifier: MIT
// The tables against the shared MIME database of this machine, where it is installed.
#include <gtest/gtest.h>

#include <algorithm>
#include <fstream>
#include <functional>
#include <map>
#include <optional>
#include <set>
#include <sstream>
#include <string>

#include "platform/types/file_types.h"

namespace brivo {
namespace {

constexpr const char* kGlobs = "/usr/share/mime/globs2";
constexpr const char* kSubclasses = "/usr/share/mime/subclasses";

/// Calls `visit` with each line of a file of the database that says something.
void forEachLine(const char* path, const std::function<void(const std::string&)>& visit) {
  std::ifstream file(path);
  for (std::string line; std::getline(file, line);) {
    if (!line.empty() && line[0] != '#') visit(line);
  }
}

/// The extension in a glob that is "*." and an extension; none for any other.
std::optional<std::string> plainExtension(const std::string& glob) {
  if (!glob.starts_with("*.")) return std::nullopt;
  const std::string extension = glob.substr(2);
  const bool isPlain = extension.find_first_of(".*?[") == std::string::npos;
  return isPlain ? std::optional(extension) : std::nullopt;
}

/// The extensions of the types that `isWanted` takes.
std::set<std::string> extensionsOf(const std::function<bool(const std::string& type)>& isWanted) {
  std::set<std::string> extensions;
  forEachLine(kGlobs, [&](const std::string& line) {
    std::istringstream fields(line);
    std::string weight, type, glob;
    std::getline(fields, weight, ':');
    std::getline(fields, type, ':');
    std::getline(fields, glob, ':');
    const auto extension = plainExtension(glob);
    if (extension && isWanted(type)) extensions.insert(*extension);
  });
  return extensions;
}

std::set<std::string> typesBelow(const std::string& parent) {
  std::set<std::string> types;
  forEachLine(kSubclasses, [&](const std::string& line) {
    const auto blank = line.find(' ');
    if (blank != std::string::npos && line.substr(blank + 1) == parent) types.insert(line.substr(0, blank));
  });
  return types;
}

using Reasons = std::map<std::string, std::string>;

/// What `isKnown` does not know, without what there is a reason for; and reasons for what it does know.
std::set<std::string> unexplained(const std::set<std::string>& extensions, bool (*isKnown)(std::string_view),
                                  const Reasons& reasons) {
  std::set<std::string> wrong;
  for (const std::string& extension : extensions) {
    if (isKnown(extension) == reasons.contains(extension)) wrong.insert(extension);
  }
  return wrong;
}

const Reasons& moviesLeftOut() {
  static const std::string index = "an index of a Blu-ray or AVCHD disc, which holds no pictures";
  static const std::string list = "a text that lists movies";
  static const std::string sound = "a sound for all but the rarest files; the audio table has it";
  static const Reasons reasons{{"bdm", index}, {"bdmv", index}, {"clpi", index}, {"cpi", index},
                               {"mpl", index}, {"mpls", index}, {"m1u", list},   {"m4u", list},
                               {"mxu", list},  {"mp2", sound},  {"ogg", sound}};
  return reasons;
}

const Reasons& soundsLeftOut() {
  static const std::string list = "a list of sounds, which holds none";
  static const Reasons reasons{{"amz", list},
                               {"asx", list},
                               {"m3u", list},
                               {"m3u8", list},
                               {"pla", list},
                               {"pls", list},
                               {"vlc", list},
                               {"wax", list},
                               {"wmx", list},
                               {"wvx", list},
                               {"ass", "subtitles; the database prefers that type"},
                               {"mod", "MPEG-2 of camcorders on a card; the movie table has it"}};
  return reasons;
}

class MimeDatabase : public testing::Test {
 protected:
  void SetUp() override {
    if (!std::ifstream(kGlobs) || !std::ifstream(kSubclasses)) GTEST_SKIP() << "no shared-mime-info here";
  }
};

TEST_F(MimeDatabase, EveryCameraRawExtensionIsKnown) {
  const auto raw = typesBelow("image/x-dcraw");
  const auto extensions = extensionsOf([&](const std::string& type) { return raw.contains(type); });
  EXPECT_TRUE(extensions.contains("nef"));
  EXPECT_EQ(unexplained(extensions, isCameraRawExtension, {}), std::set<std::string>{});
}

TEST_F(MimeDatabase, EveryExtensionOfAnImageThatDecodersReadIsKnown) {
  const std::set<std::string> decoded{"image/avif",
                                      "image/bmp",
                                      "image/gif",
                                      "image/heif",
                                      "image/jp2",
                                      "image/jpeg",
                                      "image/jpx",
                                      "image/png",
                                      "image/tiff",
                                      "image/webp",
                                      "image/x-jp2-codestream"};
  const auto extensions = extensionsOf([&](const std::string& type) { return decoded.contains(type); });
  EXPECT_TRUE(extensions.contains("heic"));
  EXPECT_EQ(unexplained(extensions, isDecodableImageExtension, {}), std::set<std::string>{});
}

TEST_F(MimeDatabase, EveryMovieExtensionIsKnown) {
  const auto extensions = extensionsOf([](const std::string& type) { return type.starts_with("video/"); });
  EXPECT_TRUE(extensions.contains("mov"));
  EXPECT_EQ(unexplained(extensions, isMovieExtension, moviesLeftOut()), std::set<std::string>{});
}

TEST_F(MimeDatabase, EverySoundExtensionIsKnown) {
  const auto extensions = extensionsOf([](const std::string& type) { return type.starts_with("audio/"); });
  EXPECT_TRUE(extensions.contains("wav"));
  EXPECT_EQ(unexplained(extensions, isAudioExtension, soundsLeftOut()), std::set<std::string>{});
}

}  // namespace
}  // namespace brivo
