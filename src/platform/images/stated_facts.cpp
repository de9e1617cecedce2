// SPDX-License-Identifier: MIT
#include "platform/images/stated_facts.h"

#include <fmt/format.h>

#include <chrono>
#include <span>
#include <string>

#include "platform/images/exif.h"
#include "platform/images/tiff_block.h"

namespace brivo::images {

namespace {

constexpr std::uint16_t kModel = 0x0110;
constexpr std::uint16_t kDateTimeOriginal = 0x9003;

void keepText(Parse& parse, ExifGroup group, std::uint16_t tag, std::string_view text) {
  const std::string_view upToNul = text.substr(0, text.find('\0'));
  parse.found.entries.add(group, tag, static_cast<std::uint16_t>(TiffType::ascii),
                          std::as_bytes(std::span(upToNul)), std::endian::little);
}

/// As EXIF 2.32 writes times.
std::string exifTime(std::chrono::sys_seconds time) {
  const auto day = std::chrono::floor<std::chrono::days>(time);
  const std::chrono::year_month_day date(day);
  const std::chrono::hh_mm_ss clock(time - day);
  return fmt::format("{:04}:{:02}:{:02} {:02}:{:02}:{:02}", static_cast<int>(date.year()),
                     static_cast<unsigned>(date.month()), static_cast<unsigned>(date.day()),
                     clock.hours().count(), clock.minutes().count(), clock.seconds().count());
}

}  // namespace

void keepMake(Parse& parse, std::string_view make) { keepText(parse, ExifGroup::tiff, tag::kMake, make); }

void keepModel(Parse& parse, std::string_view model) { keepText(parse, ExifGroup::tiff, kModel, model); }

void keepCaptureTime(Parse& parse, std::uint32_t seconds) {
  if (seconds == 0) return;
  const std::chrono::sys_seconds time{std::chrono::seconds(seconds)};
  keepText(parse, ExifGroup::exif, kDateTimeOriginal, exifTime(time));
}

std::uint16_t orientationOfDegrees(std::int32_t degrees) {
  switch ((degrees % 360 + 360) % 360) {
    case 0:
      return 1;
    case 90:
      return 6;
    case 180:
      return 3;
    case 270:
      return 8;
    default:
      return 0;
  }
}

}  // namespace brivo::images
