// SPDX-License-Identifier: MIT
#include "oracle_facts.h"

#include <array>
#include <optional>

namespace brivo::images {

namespace {

using nlohmann::json;

/// The same fact in our words and in theirs.
struct Entry {
  ExifGroup group;
  const char* name;
  const char* expected;
};
constexpr std::array<Entry, 5> kEntries{{{ExifGroup::exif, "DateTimeOriginal", "date_time_original"},
                                         {ExifGroup::exif, "DateTimeDigitized", "create_date"},
                                         {ExifGroup::tiff, "DateTime", "modify_date"},
                                         {ExifGroup::tiff, "Make", "make"},
                                         {ExifGroup::tiff, "Model", "model"}}};

/// Keeps a text without the blanks at its end, unless nothing is left.
void setText(Facts& facts, const std::string& fact, std::string text) {
  text.erase(text.find_last_not_of(' ') + 1);
  if (!text.empty()) facts.texts[fact] = std::move(text);
}

std::string textOfRange(std::uint64_t offset, std::uint64_t length) {
  return std::to_string(length) + " bytes at " + std::to_string(offset);
}

void setThumbnail(Facts& facts, std::uint64_t offset, std::uint64_t length) {
  setText(facts, "thumbnail", textOfRange(offset, length));
  facts.thumbnailOffset = offset;
}

/// exiftool shows texts that look like numbers as numbers.
std::string textOf(const json& value) { return value.is_string() ? value.get<std::string>() : value.dump(); }

PixelSize sizeOf(const json& picture) {
  return {picture.value("width", std::uint32_t{0}), picture.value("height", std::uint32_t{0})};
}

/// A JPEG that lies in the file as it is.
bool isPlainJpeg(const json& picture) {
  return picture.value("jpeg", false) && picture.value("in_file", true) && picture.at("offset").is_number();
}

/// The EXIF orientation that looks like a turn of `degrees` against the clock (ISO/IEC 23008-12, "irot").
std::string orientationOfTurn(unsigned degrees) {
  constexpr std::array<const char*, 4> kOrientations{"1", "8", "3", "6"};
  return kOrientations.at(degrees / 90);
}

std::string orientationOf(const json& expected, bool isShownByItems) {
  if (!isShownByItems) return expected.contains("orientation") ? textOf(expected["orientation"]) : "";
  const json turns = expected.value("orientations", json::object());
  return turns.contains("QuickTime:Rotation") ? orientationOfTurn(turns["QuickTime:Rotation"]) : "";
}

}  // namespace

std::string textOf(PixelSize size) {
  return std::to_string(size.width) + " x " + std::to_string(size.height);
}

Facts factsOf(const ImageProperties& all, const ImageProperties& previews) {
  Facts facts;
  for (const PixelSize size : {all.size, previews.crop}) {
    if (size) facts.sizes.push_back(size);
  }
  if (all.orientation != 0) setText(facts, "orientation", std::to_string(all.orientation));
  for (const Entry& entry : kEntries) {
    const auto value = all.entries.find(entry.group, entry.name);
    if (!value) continue;
    const std::string* text = value->get<std::string>();
    setText(facts, entry.name, text ? *text : describe(*value));
  }
  const EmbeddedImage& thumbnail = all.thumbnail;
  if (thumbnail) setThumbnail(facts, thumbnail.offset, thumbnail.length);
  for (const EmbeddedImage& image : previews.embedded)
    facts.previews.emplace(image.offset, Preview{image.length, image.size});
  if (thumbnail && !facts.previews.contains(thumbnail.offset))
    facts.previews.emplace(thumbnail.offset, Preview{thumbnail.length, thumbnail.size});
  return facts;
}

Facts factsOf(const json& expected, bool isShownByItems) {
  Facts facts;
  if (const PixelSize size = sizeOf(expected)) facts.sizes.push_back(size);
  setText(facts, "orientation", orientationOf(expected, isShownByItems));
  for (const Entry& entry : kEntries) {
    if (expected.contains(entry.expected)) setText(facts, entry.name, textOf(expected[entry.expected]));
  }
  const json thumbnail = expected.value("exif_thumbnail", json::object());
  if (!thumbnail.empty() && isPlainJpeg(thumbnail))
    setThumbnail(facts, thumbnail["offset"], thumbnail["length"]);
  for (const json& picture : expected.value("images", json::array())) {
    if (isPlainJpeg(picture))
      facts.previews.emplace(picture["offset"], Preview{picture["length"], sizeOf(picture)});
  }
  return facts;
}

}  // namespace brivo::images
