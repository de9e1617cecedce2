// SPDX-License-Identifier: MIT
// ls, info, read, rm
#include <fmt/core.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <filesystem>
#include <optional>

#include "brivoctl/command.h"
#include "brivoctl/output.h"
#include "brivoctl/selection.h"
#include "brivoctl/value_json.h"
#include "platform/base/base64.h"

namespace brivoctl {

namespace {

struct ListOptions {
  std::string device;
  bool longForm = false;
};

std::string shownPixels(std::uint32_t width, std::uint32_t height) {
  return width == 0 || height == 0 ? "-" : fmt::format("{}x{}", width, height);
}

/// A size that is only the mark of a thumbnail is not known.
std::string shownThumbnail(const orvid::ObjectInfo& info) {
  constexpr std::uint32_t kMark = 1;
  if (info.thumbSize == 0) return "-";
  if (info.thumbSize == kMark) return "decoded";
  return fmt::format("{} @{}", shownPixels(info.thumbWidth, info.thumbHeight), info.thumbOffset);
}

std::string shownObject(const orvid::ObjectInfo& info, bool longForm) {
  std::string line = fmt::format("{:>8}  {:>10}  {}", info.handle, info.isFolder ? "-" : shownSize(info.size),
                                 shownTime(info.captured));
  if (longForm) {
    line += fmt::format("  {:>11}  {:>1}  {:>16}", shownPixels(info.width, info.height),
                        info.orientation == 0 ? "-" : std::to_string(info.orientation), shownThumbnail(info));
  }
  return line + "  " + shown(info.path) + (info.isFolder ? "/" : "");
}

ExitCode list(const CommonOptions& common, const ListOptions& options) {
  const auto selected = openDevice(common, options.device);
  if (const auto* code = std::get_if<ExitCode>(&selected)) return *code;
  const auto catalogue = std::get<0>(selected).device->catalogue(common.wait());
  if (!catalogue.ok()) return report(catalogue.error());
  if (common.json) {
    Json objects = Json::array();
    for (const auto& object : *catalogue) objects.push_back(jsonOf(object.info()));
    printJson(objects);
    return kSuccess;
  }
  for (const auto& object : *catalogue) printLine(shownObject(object.info(), options.longForm));
  return kSuccess;
}

ExitCode info(const CommonOptions& common, const std::vector<std::string>& arguments) {
  const auto selected = openObjects(common, arguments);
  if (const auto* code = std::get_if<ExitCode>(&selected)) return *code;
  const auto& objects = std::get<0>(selected).objects;
  if (objects.size() != 1) return fail("info takes one object", kUsage);
  const auto metadata = objects.front().metadata(common.wait());
  if (!metadata.ok()) return report(metadata.error());
  if (common.json) {
    printJson(jsonOf(*metadata));
  } else if (metadata->empty()) {
    fmt::print(stderr, "brivoctl: {} has no metadata\n", shown(objects.front().info().path));
  } else {
    fmt::print("{}", linesOf(*metadata));
  }
  return kSuccess;
}

struct ReadOptions {
  std::vector<std::string> arguments;
  std::uint64_t offset = 0;
  std::optional<std::uint64_t> length;
};

ExitCode read(const CommonOptions& common, const ReadOptions& options) {
  const auto selected = openObjects(common, options.arguments);
  if (const auto* code = std::get_if<ExitCode>(&selected)) return *code;
  const auto& objects = std::get<0>(selected).objects;
  if (objects.size() != 1) return fail("read takes one object", kUsage);
  const orvid::Object& object = objects.front();
  const std::uint64_t size = object.info().size;
  if (options.offset > size) return fail("the offset is beyond the object's end");
  std::uint64_t left = options.length.value_or(size - options.offset);
  std::vector<std::byte> all;  // for JSON alone
  for (std::uint64_t offset = options.offset; left > 0;) {
    const auto piece = object.read(offset, std::min(left, orvid::Object::kLongestRead), common.wait());
    if (!piece.ok()) return report(piece.error());
    if (piece->empty()) return fail("the medium gave no more bytes");
    if (common.json) {
      all.insert(all.end(), piece->bytes().begin(), piece->bytes().end());
    } else if (std::fwrite(piece->bytes().data(), 1, piece->size(), stdout) != piece->size()) {
      return fail("cannot write to standard output");
    }
    offset += piece->size();
    left -= piece->size();
  }
  if (common.json) {
    printJson(
        {{"handle", object.info().handle}, {"offset", options.offset}, {"data", brivo::encodeBase64(all)}});
  }
  return std::fflush(stdout) == 0 ? kSuccess : fail("cannot write to standard output");
}

ExitCode remove(const CommonOptions& common, const std::vector<std::string>& arguments) {
  const auto selected = openObjects(common, arguments);
  if (const auto* code = std::get_if<ExitCode>(&selected)) return *code;
  ExitCode worst = kSuccess;
  for (const auto& object : std::get<0>(selected).objects) {
    const auto removed = object.remove(common.wait());
    if (!removed.ok()) worst = std::max(worst, report(removed.error()));
    if (common.json) {
      printJsonLine(
          {{"handle", object.info().handle}, {"path", object.info().path}, {"deleted", removed.ok()}});
    }
  }
  return worst;
}

}  // namespace

void addObjectCommands(CLI::App& app, CommonOptions& common, ExitCode& exitCode) {
  const auto add = [&](const char* name, const char* text) {
    return addServiceCommand(app, common, name, text);
  };
  CLI::App* ls = add("ls", "List the objects of a device");
  const auto listOptions = std::make_shared<ListOptions>();
  ls->add_option("DEVICE", listOptions->device, "Which device");
  ls->add_flag(
      "-l,--long", listOptions->longForm,
      "Show pixels, EXIF orientation and embedded thumbnail (its size and where in the file it begins)");
  ls->callback([&common, &exitCode, listOptions] { exitCode = list(common, *listOptions); });

  CLI::App* describing = add("info", "Show the metadata of an object");
  const auto described = std::make_shared<std::vector<std::string>>();
  describing->add_option("OBJECT", *described, "[DEVICE] OBJECT")->required()->expected(1, 2);
  describing->callback([&common, &exitCode, described] { exitCode = info(common, *described); });

  CLI::App* reading = add("read", "Write bytes of an object to standard output");
  const auto readOptions = std::make_shared<ReadOptions>();
  reading->add_option("OBJECT", readOptions->arguments, "[DEVICE] OBJECT")->required()->expected(1, 2);
  reading->add_option("--offset", readOptions->offset, "Where to begin, in bytes")
      ->check(CLI::NonNegativeNumber);
  reading->add_option("--length", readOptions->length, "How many bytes; to the end when left out");
  reading->callback([&common, &exitCode, readOptions] { exitCode = read(common, *readOptions); });

  CLI::App* removing = add("rm", "Delete objects from the card");
  const auto objects = std::make_shared<std::vector<std::string>>();
  removing->add_option("OBJECT", *objects, "[DEVICE] OBJECT...")->required();
  removing->callback([&common, &exitCode, objects] { exitCode = remove(common, *objects); });
}

}  // namespace brivoctl
