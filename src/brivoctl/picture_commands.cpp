// SPDX-License-Identifier: MIT
// thumb, sheet
#include <fmt/core.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <map>
#include <memory>

#include "brivoctl/command.h"
#include "brivoctl/contact_sheet.h"
#include "brivoctl/output.h"
#include "brivoctl/output_file.h"
#include "brivoctl/progress_line.h"
#include "brivoctl/selection.h"
#include "brivoctl/thumbnail_stream.h"
#include "platform/base/paths.h"
#include "platform/text/unicode.h"
#include "platform/types/file_types.h"

namespace brivoctl {

namespace {

// Keys of the thumbnail dictionary.
constexpr const char* kThumbnailKey = "thumb";
constexpr const char* kOrientationKey = "Orientation";

constexpr std::uint32_t kUsualSize = 160;  // of EXIF thumbnails

std::span<const std::byte> thumbnailIn(const orvid::Dictionary& reply) {
  const orvid::Data* data = reply.data(kThumbnailKey);
  return data ? data->bytes() : std::span<const std::byte>();
}

// ---------------------------------------------------------------------------------------------------- thumb

struct ThumbOptions {
  std::vector<std::string> arguments;
  std::uint32_t size = kUsualSize;
  std::string file;
};

constexpr const char* kStandardOutput = "-";

/// What is wrong with the file that the thumbnail is to become; an exit code once that was said.
std::optional<ExitCode> refused(const CommonOptions& common, const ThumbOptions& options) {
  if (options.file != kStandardOutput) {
    const auto obstacle = outputObstacle(options.file);
    return obstacle ? std::optional(fail(shown(*obstacle))) : std::nullopt;
  }
  if (common.json) return fail("--json and -o - both want standard output", kUsage);
  if (::isatty(STDOUT_FILENO) == 1) return fail("a terminal shows no pictures; say -o FILE", kUsage);
  return std::nullopt;
}

ExitCode writeToStandardOutput(std::span<const std::byte> bytes) {
  const bool isWritten = std::fwrite(bytes.data(), 1, bytes.size(), stdout) == bytes.size();
  return isWritten && !outputFailed() ? kSuccess : fail("cannot write to standard output");
}

void describe(const CommonOptions& common, const orvid::Dictionary& reply, const std::string& file) {
  const auto bytes = thumbnailIn(reply);
  const PictureSize size = jpegSize(bytes).value_or(PictureSize());
  if (!common.json) {
    return printLine(
        fmt::format("{}  {}x{}  {}", shown(file), size.width, size.height, shownSize(bytes.size())));
  }
  Json document = {{"bytes", bytes.size()}, {"width", size.width}, {"height", size.height}};
  if (const auto orientation = reply.unsignedInteger(kOrientationKey)) document["orientation"] = *orientation;
  document["file"] = file;
  printJson(document);
}

ExitCode thumb(const CommonOptions& common, const ThumbOptions& options) {
  if (const auto code = refused(common, options)) return *code;
  const auto selected = openObjects(common, options.arguments);
  if (const auto* code = std::get_if<ExitCode>(&selected)) return *code;
  const auto& objects = std::get<0>(selected).objects;
  if (objects.size() != 1) return fail("thumb takes one object", kUsage);
  const auto reply = objects.front().thumbnail(options.size, common.wait());
  if (!reply.ok()) return report(reply.error());
  const auto bytes = thumbnailIn(*reply);
  if (bytes.empty()) return fail(shown(objects.front().info().path) + " has no thumbnail");
  if (options.file == kStandardOutput) return writeToStandardOutput(bytes);
  if (const auto error = writeOutput(options.file, bytes)) return fail(shown(*error));
  describe(common, *reply, options.file);
  return kSuccess;
}

// ---------------------------------------------------------------------------------------------------- sheet

struct SheetOptions {
  std::string device;
  std::string file;
  std::uint32_t size = kUsualSize;
  std::optional<std::size_t> columns;
  std::size_t limit = 1000;
};

std::optional<SheetFormat> formatOf(const std::string& file) {
  const std::string extension = brivo::asciiLowerCased(brivo::pathExtension(file));
  if (extension == "jpg" || extension == "jpeg") return SheetFormat::jpeg;
  if (extension == "png") return SheetFormat::png;
  return std::nullopt;
}

bool isPictureOrMovie(const orvid::ObjectInfo& object) {
  if (object.isFolder) return false;
  const std::string extension = brivo::asciiLowerCased(brivo::pathExtension(object.name));
  return brivo::isDecodableImageExtension(extension) || brivo::isCameraRawExtension(extension) ||
         brivo::isMovieExtension(extension);
}

/// The pictures and movies of a card, those of a folder one after another.
struct Shown {
  std::vector<orvid::Object> objects;
  std::vector<std::string> folders;
  std::vector<std::size_t> counts;  ///< for each folder
};

Shown shownIn(const std::vector<orvid::Object>& catalogue, std::size_t limit) {
  Shown all;
  std::map<std::string_view, std::size_t> places;
  std::vector<std::vector<orvid::Object>> byFolder;
  for (std::size_t left = limit; const auto& object : catalogue) {
    if (left == 0 || !isPictureOrMovie(object.info())) continue;
    --left;
    const auto [place, isNew] = places.try_emplace(brivo::parentPath(object.info().path), places.size());
    if (isNew) {
      all.folders.emplace_back(place->first);
      byFolder.emplace_back();
    }
    byFolder[place->second].push_back(object);
  }
  for (const auto& objects : byFolder) {
    all.objects.insert(all.objects.end(), objects.begin(), objects.end());
    all.counts.push_back(objects.size());
  }
  return all;
}

SheetLayout layoutOf(const Shown& all, const SheetOptions& options) {
  SheetLayout::Options layout{all.counts, all.folders.size() > 1, options.size, 1};
  layout.columns = options.columns ? std::min(*options.columns, std::ranges::max(all.counts))
                                   : SheetLayout::columnsFor(layout);
  return SheetLayout(std::move(layout));
}

/// Says why, when the sheet cannot be made.
std::optional<ExitCode> refused(const SheetLayout& layout, SheetFormat format) {
  const auto why = [&](const char* advice) {
    return fail(
        fmt::format("the sheet would have {} x {} pixels, and a file of this kind holds {} a side and {} "
                    "in all; {}",
                    layout.width(), layout.height(), ContactSheet::longestSide(format),
                    ContactSheet::kMostPixels, advice));
  };
  switch (ContactSheet::obstacle(layout, format)) {
    case SheetObstacle::tooWide:
      return why("take fewer --columns or a smaller --size");
    case SheetObstacle::tooTall:
      return why("take more --columns, a smaller --size or a smaller --limit");
    case SheetObstacle::tooManyPixels:
      return why("take a smaller --size or a smaller --limit");
    case SheetObstacle::none:
      break;
  }
  return std::nullopt;
}

/// False when there is nothing to be shown of the object. Where no orientation comes with the thumbnail, the
/// catalogue's holds.
bool drawAnswer(ContactSheet& sheet, const ThumbnailStream::Answer& answer, const orvid::ObjectInfo& info) {
  const auto bytes = answer.reply.ok() ? thumbnailIn(*answer.reply) : std::span<const std::byte>();
  if (bytes.empty()) {
    sheet.drawNeutral(answer.index, "no thumbnail");
    return false;
  }
  const auto orientation = answer.reply->unsignedInteger(kOrientationKey).value_or(info.orientation);
  if (sheet.drawPicture(answer.index, bytes, orientation)) return true;
  sheet.drawNeutral(answer.index, "damaged thumbnail");
  return false;
}

/// Draws all; how many could not be shown. What fails for a reason that is not the object's fails the sheet.
Selected<std::size_t> draw(ContactSheet& sheet, const Shown& all, const SheetOptions& options,
                           const CommonOptions& common) {
  for (std::size_t index = 0; sheet.layout().hasHeadings() && index < all.folders.size(); ++index)
    sheet.drawHeading(index, shown(all.folders[index]));
  ThumbnailStream thumbnails(all.objects, options.size, common.wait());
  ProgressLine progress;
  std::size_t missing = 0;
  for (std::size_t done = 1; const auto answer = thumbnails.next(); ++done) {
    const bool isCardsFault = answer->reply.ok() || answer->reply.error().kind == orvid::ErrorKind::request;
    if (!isCardsFault) {
      progress.erase();
      return report(answer->reply.error());
    }
    const orvid::ObjectInfo& info = all.objects[answer->index].info();
    const std::string name = shown(info.name);
    missing += drawAnswer(sheet, *answer, info) ? 0 : 1;
    sheet.drawCaption(answer->index, name);
    const double share = static_cast<double>(done) / static_cast<double>(all.objects.size());
    if (progress.isDue()) progress.show(name, share, fmt::format("{} of {}", done, all.objects.size()));
  }
  return missing;
}

void describe(const CommonOptions& common, const SheetLayout& layout, const std::string& file,
              std::size_t missing) {
  if (common.json) {
    return printJson({{"file", file},
                      {"width", layout.width()},
                      {"height", layout.height()},
                      {"columns", layout.columns()},
                      {"rows", layout.rows()},
                      {"objects", layout.tiles()},
                      {"missing", missing}});
  }
  printLine(fmt::format("{}  {}x{}  {} objects, {} without a thumbnail", shown(file), layout.width(),
                        layout.height(), layout.tiles(), missing));
}

ExitCode make(const CommonOptions& common, const SheetOptions& options, SheetFormat format,
              const Shown& all) {
  SheetLayout layout = layoutOf(all, options);
  if (const auto code = refused(layout, format)) return *code;
  ContactSheet sheet(std::move(layout));
  const auto missing = draw(sheet, all, options, common);
  if (const auto* code = std::get_if<ExitCode>(&missing)) return *code;
  const auto bytes = sheet.encode(format);
  if (!bytes) return fail("there is not enough memory for the sheet");
  if (const auto error = writeOutput(options.file, bytes->bytes())) return fail(shown(*error));
  describe(common, sheet.layout(), options.file, std::get<0>(missing));
  return kSuccess;
}

ExitCode sheet(const CommonOptions& common, const SheetOptions& options) {
  const auto format = formatOf(options.file);
  if (!format) return fail("a sheet is a .jpg or a .png: " + shown(options.file), kUsage);
  if (const auto obstacle = outputObstacle(options.file)) return fail(shown(*obstacle));
  const auto selected = openDevice(common, options.device);
  if (const auto* code = std::get_if<ExitCode>(&selected)) return *code;
  const auto catalogue = std::get<0>(selected).device->catalogue(common.wait());
  if (!catalogue.ok()) return report(catalogue.error());
  const auto there = static_cast<std::size_t>(std::ranges::count_if(
      *catalogue, [](const orvid::Object& object) { return isPictureOrMovie(object.info()); }));
  if (there == 0) return fail("there are no pictures and no movies");
  const ExitCode code = make(common, options, *format, shownIn(*catalogue, options.limit));
  if (code == kSuccess && there > options.limit)
    fail(fmt::format("{} objects are left out; --limit takes more in", there - options.limit));
  return code;
}

}  // namespace

void addPictureCommands(CLI::App& app, CommonOptions& common, ExitCode& exitCode) {
  CLI::App* thumbing = addServiceCommand(app, common, "thumb", "Save the thumbnail of an object");
  const auto thumbOptions = std::make_shared<ThumbOptions>();
  thumbing->add_option("OBJECT", thumbOptions->arguments, "[DEVICE] OBJECT")->required()->expected(1, 2);
  thumbing->add_option("-o,--output", thumbOptions->file, "The JPEG file; - is standard output")->required();
  thumbing->add_option("--size", thumbOptions->size, "Wanted width in pixels")
      ->check(CLI::Range(1, 65'500))
      ->capture_default_str();
  thumbing->footer(
      "The bytes are those that the service gives, stored as the camera stored them: the orientation of "
      "--json "
      "says how they are shown (EXIF, 1 to 8).");
  thumbing->callback([&common, &exitCode, thumbOptions] { exitCode = thumb(common, *thumbOptions); });

  CLI::App* sheeting =
      addServiceCommand(app, common, "sheet", "Make a contact sheet of all pictures and movies");
  const auto options = std::make_shared<SheetOptions>();
  sheeting->add_option("DEVICE", options->device, "Which device");
  sheeting->add_option("-o,--output", options->file, "The file, a .jpg or a .png")->required();
  sheeting->add_option("--size", options->size, "Longest side of a picture on the sheet, in pixels")
      ->check(CLI::Range(16, 4096))
      ->capture_default_str();
  sheeting
      ->add_option("--columns", options->columns,
                   "How many pictures side by side; by the sheet's shape when left out")
      ->check(CLI::Range(1, 65'500));
  sheeting->add_option("--limit", options->limit, "The most objects that are shown")
      ->check(CLI::Range(1, 10'000'000))
      ->capture_default_str();
  sheeting->callback([&common, &exitCode, options] { exitCode = sheet(common, *options); });
}

}  // namespace brivoctl
