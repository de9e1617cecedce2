// SPDX-License-Identifier: MIT
#include "oracle.h"

#include <algorithm>
#include <array>
#include <map>
#include <set>
#include <utility>

#include "file_source.h"
#include "oracle_facts.h"
#include "platform/images/image_reader.h"

namespace brivo::images {

namespace {

bool isShownByItems(std::string_view kind) { return kind == "HEIF" || kind == "AVIF"; }

class Comparison {
 public:
  Comparison(Facts ours, Facts theirs) : ours_(std::move(ours)), theirs_(std::move(theirs)) {}

  std::vector<Disagreement> run() {
    compareSizes();
    acceptOtherThumbnail();
    compareTexts();
    comparePreviews();
    return std::move(found_);
  }

 private:
  void compareSizes() {
    const PixelSize theirs = theirs_.sizes.empty() ? PixelSize() : theirs_.sizes.front();
    if (std::ranges::find(ours_.sizes, theirs) != ours_.sizes.end()) return;
    if (!theirs && ours_.sizes.empty()) return;
    found_.push_back(
        {"size", ours_.sizes.empty() ? "" : textOf(ours_.sizes.front()), theirs ? textOf(theirs) : ""});
  }

  /// A raw file without an EXIF thumbnail has one of its other finished JPEGs for one.
  void acceptOtherThumbnail() {
    if (!textIn(theirs_, "thumbnail").empty() || textIn(ours_, "thumbnail").empty()) return;
    if (agreeOnPreview(ours_.thumbnailOffset)) ours_.texts.erase("thumbnail");
  }

  void compareTexts() {
    std::set<std::string> facts;
    for (const Facts* side : {&ours_, &theirs_}) {
      for (const auto& [fact, text] : side->texts) facts.insert(fact);
    }
    for (const std::string& fact : facts) {
      const std::string ours = textIn(ours_, fact), theirs = textIn(theirs_, fact);
      if (ours != theirs) found_.push_back({fact, ours, theirs});
    }
  }

  /// A thumbnail is a fact of its own, and only one of the two may list it among the previews too.
  void comparePreviews() {
    std::set<std::uint64_t> offsets;
    for (const Facts* side : {&ours_, &theirs_}) {
      for (const auto& [offset, preview] : side->previews) offsets.insert(offset);
    }
    for (const std::uint64_t offset : offsets) {
      const bool isOnlyThumbnail = offset == theirs_.thumbnailOffset ||
                                   (offset == ours_.thumbnailOffset && !theirs_.previews.contains(offset));
      if (!isOnlyThumbnail && !agreeOnPreview(offset))
        found_.push_back(
            {"preview at " + std::to_string(offset), previewIn(ours_, offset), previewIn(theirs_, offset)});
    }
  }

  /// Several tags can name the same JPEG with other lengths: any will do.
  bool agreeOnPreview(std::uint64_t offset) const {
    const auto ours = ours_.previews.find(offset);
    if (ours == ours_.previews.end()) return false;
    const auto [begin, end] = theirs_.previews.equal_range(offset);
    return std::any_of(begin, end, [&](const auto& theirs) {
      return theirs.second.length == ours->second.length &&
             (!theirs.second.size || theirs.second.size == ours->second.size);
    });
  }

  static std::string textIn(const Facts& facts, const std::string& fact) {
    const auto place = facts.texts.find(fact);
    return place != facts.texts.end() ? place->second : "";
  }
  static std::string previewIn(const Facts& facts, std::uint64_t offset) {
    const auto place = facts.previews.find(offset);
    if (place == facts.previews.end()) return "";
    return std::to_string(place->second.length) + " bytes, " + textOf(place->second.size);
  }

  Facts ours_;
  Facts theirs_;
  std::vector<Disagreement> found_;
};

bool beginsJpeg(const ByteSource& source, const EmbeddedImage& image) {
  std::array<std::byte, 2> start{};
  const bool isInside = image.offset <= source.size() && image.length <= source.size() - image.offset;
  return isInside && source.read(start, image.offset) == start.size() && start[0] == std::byte{0xFF} &&
         start[1] == std::byte{0xD8};
}

void checkJpegs(const ByteSource& source, const ImageProperties& properties,
                std::vector<Disagreement>& found) {
  std::vector<EmbeddedImage> images = properties.embedded;
  if (properties.thumbnail) images.push_back(properties.thumbnail);
  for (const EmbeddedImage& image : images) {
    if (!beginsJpeg(source, image))
      found.push_back({"bytes at " + std::to_string(image.offset), "a JPEG", "none"});
  }
}

/// What the cheap call and the full call must both say.
std::string commonFacts(ImageProperties properties) {
  properties.embedded.clear();
  return describe(Value(flatDictionary(properties)));
}

}  // namespace

std::string_view kindOf(const CorpusFile& file) {
  static const std::map<std::string, std::string_view> kinds{{"JPEG", "JPEG"},    {"MPO", "JPEG"},
                                                             {"THM", "JPEG"},     {"HEIC", "HEIF"},
                                                             {"HEIF", "HEIF"},    {"HEIFS", "HEIF"},
                                                             {"AVIF", "AVIF"},    {"TIFF", "TIFF"},
                                                             {"BTF", "TIFF"},     {"PNG", "PNG"},
                                                             {"WEBP", "WebP"},    {"CR2", "CR2"},
                                                             {"NEF", "NEF"},      {"Extended WEBP", "WebP"},
                                                             {"ARW", "ARW"},      {"ORF", "ORF"},
                                                             {"RW2", "RW2"},      {"RAW", "RW2"},
                                                             {"RAF", "RAF"},      {"PEF", "PEF"},
                                                             {"CR3", "CR3"},      {"DNG", "DNG"},
                                                             {"CRW", "OtherRaw"}, {"KDC", "OtherRaw"},
                                                             {"MRW", "OtherRaw"}, {"SRW", "OtherRaw"},
                                                             {"X3F", "OtherRaw"}};
  const auto place = kinds.find(file.facts.value("file_type", ""));
  return place != kinds.end() ? place->second : std::string_view();
}

std::vector<Disagreement> compare(const Corpus& corpus, const CorpusFile& file) {
  const std::string_view kind = kindOf(file);
  const FileSource source(corpus.pathOf(file));
  const auto basics = copySequentialProperties(source);
  const auto all = copyImageProperties(source);
  const auto previews = copyContainerProperties(source);
  if (!basics || !all || !previews) return {{"container", "", std::string(kind)}};
  Facts ours = factsOf(*all, *previews), theirs = factsOf(file.facts, isShownByItems(kind));
  if (isShownByItems(kind) || kind == "OtherRaw") {
    // Where no EXIF states it, none and a turn of nothing are shown alike.
    for (Facts* side : {&ours, &theirs}) {
      if (side->texts["orientation"] == "1") side->texts.erase("orientation");
    }
  }
  std::vector<Disagreement> found = Comparison(std::move(ours), std::move(theirs)).run();
  checkJpegs(source, *all, found);
  checkJpegs(source, *previews, found);
  if (commonFacts(*basics) != commonFacts(*all)) found.push_back({"cheap call", "not as the full call", ""});
  return found;
}

}  // namespace brivo::images
