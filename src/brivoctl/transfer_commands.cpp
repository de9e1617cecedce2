// SPDX-License-Identifier: MIT
// get, import
#include <fmt/core.h>

#include <algorithm>
#include <atomic>
#include <csignal>
#include <filesystem>
#include <memory>

#include "brivoctl/command.h"
#include "brivoctl/import_receipt.h"
#include "brivoctl/importer.h"
#include "brivoctl/output.h"
#include "brivoctl/selection.h"
#include "brivoctl/transfer_progress.h"
#include "platform/base/paths.h"
#include "platform/digest/sha256.h"

namespace brivoctl {

namespace {

constexpr const char* kReceiptName = "import-receipt.jsonl";

/// An exit code once the reason was said, none when the folder is there.
std::optional<ExitCode> makeFolder(const std::string& folder) {
  std::error_code error;
  std::filesystem::create_directories(folder, error);
  if (!error) return std::nullopt;
  return fail(fmt::format("cannot make {}: {}", shown(folder), error.message()));
}

std::uint64_t sizeOf(const std::vector<orvid::Object>& objects) {
  std::uint64_t size = 0;
  for (const auto& object : objects) size += object.info().size;
  return size;
}

// ------------------------------------------------------------------------------------------------------ get

struct GetOptions {
  std::vector<std::string> arguments;
  std::string folder = ".";
  bool force = false;
};

/// What is wrong with saving the object there; empty when nothing is.
std::string obstacle(const orvid::ObjectInfo& object, const std::string& path, bool force) {
  if (object.isFolder) return shown(object.path) + " is a folder";
  if (!isFileName(object.name)) return "the name of " + shown(object.path) + " is no name for a file here";
  if (!force && std::filesystem::exists(path)) return shown(path) + " is there already; --force replaces it";
  return "";
}

ExitCode save(const CommonOptions& common, const orvid::Object& object, const GetOptions& options,
              TransferProgress& progress) {
  const orvid::ObjectInfo& info = object.info();
  const std::string path = brivo::appendingPathComponent(options.folder, info.name);
  if (const std::string text = obstacle(info, path, options.force); !text.empty()) {
    progress.complain(text);
    return kFailure;
  }
  progress.begin(info);
  const auto saved = object.save(
      path,
      [&](std::uint64_t bytes, std::uint64_t) {
        progress.reached(bytes);
        return true;
      },
      common.wait());
  progress.end();
  if (!saved.ok()) {
    progress.complain(textOf(saved.error()));
    return exitCodeOf(saved.error());
  }
  if (common.json) {
    progress.print({{"handle", info.handle}, {"path", info.path}, {"file", path}, {"size", info.size}});
  } else {
    progress.print(fmt::format("{}  {}", shown(path), shownSize(info.size)));
  }
  return kSuccess;
}

ExitCode get(const CommonOptions& common, const GetOptions& options) {
  const auto selected = openObjects(common, options.arguments);
  if (const auto* code = std::get_if<ExitCode>(&selected)) return *code;
  if (const auto code = makeFolder(options.folder)) return *code;
  const auto& objects = std::get<0>(selected).objects;
  TransferProgress progress(common.json, sizeOf(objects));
  ExitCode worst = kSuccess;
  for (const auto& object : objects) worst = std::max(worst, save(common, object, options, progress));
  return worst;
}

// --------------------------------------------------------------------------------------------------- import

struct ImportOptions {
  std::string device;
  std::string folder;
  std::string receipt;  ///< empty for the usual place
  bool noVerify = false;
};

/// Set by the signals that ask for an end.
std::atomic<bool> stopAsked = false;
static_assert(std::atomic<bool>::is_always_lock_free);

orvid::Result<std::string> headOf(const orvid::Object& object, orvid::Timeout timeout) {
  const std::uint64_t size = std::min(ImportReceipt::kHeadSize, object.info().size);
  if (size == 0) return brivo::sha256Of(std::string_view());
  const auto head = object.read(0, size, timeout);
  if (!head.ok()) return head.error();
  return brivo::sha256Of(head->bytes());
}

std::vector<orvid::Object> filesIn(const std::vector<orvid::Object>& catalogue) {
  std::vector<orvid::Object> files;
  std::ranges::copy_if(catalogue, std::back_inserter(files),
                       [](const orvid::Object& object) { return !object.info().isFolder; });
  return files;
}

ExitCode summarize(const CommonOptions& common, const Importer::Outcome& outcome, std::size_t present) {
  if (common.json) {
    printJsonLine({{"event", "done"},
                   {"imported", outcome.imported},
                   {"bytes", outcome.bytes},
                   {"present", present},
                   {"failed", outcome.failed},
                   {"interrupted", outcome.interrupted}});
  } else {
    printLine(fmt::format("{} imported ({}), {} imported before, {} failed", outcome.imported,
                          shownSize(outcome.bytes), present, outcome.failed));
  }
  if (outcome.interrupted) return fail("interrupted; the same command goes on where it stopped");
  return outcome.failed > 0 ? kFailure : kSuccess;
}

ExitCode importAll(const CommonOptions& common, const ImportOptions& options) {
  std::signal(SIGINT, [](int) { stopAsked = true; });
  std::signal(SIGTERM, [](int) { stopAsked = true; });
  const auto selected = openDevice(common, options.device);
  if (const auto* code = std::get_if<ExitCode>(&selected)) return *code;
  const orvid::Device& device = *std::get<0>(selected).device;
  const auto catalogue = device.catalogue(common.wait());
  if (!catalogue.ok()) return report(catalogue.error());
  if (const auto code = makeFolder(options.folder)) return *code;
  const auto receipt = ImportReceipt::open(options.receipt.empty()
                                               ? brivo::appendingPathComponent(options.folder, kReceiptName)
                                               : options.receipt);
  if (!receipt.ok()) return fail(shown(receipt.error().text()));

  const auto files = filesIn(*catalogue);
  const auto missing = (*receipt)->missing(
      device.info().name, files, [&](const orvid::Object& object) { return headOf(object, common.wait()); });
  TransferProgress progress(common.json, sizeOf(missing));
  Importer importer({options.folder, device.info().name, !options.noVerify, common.json, common.wait()},
                    **receipt, progress, stopAsked);
  importer.removeLeftovers();
  for (const auto& object : missing) {
    if (stopAsked) break;
    importer.import(object);
  }
  const Importer::Outcome outcome = importer.finish();
  progress.finish();
  return summarize(common, outcome, files.size() - missing.size());
}

}  // namespace

void addTransferCommands(CLI::App& app, CommonOptions& common, ExitCode& exitCode) {
  CLI::App* getting = addServiceCommand(app, common, "get", "Save objects as files");
  const auto getOptions = std::make_shared<GetOptions>();
  getting->add_option("OBJECT", getOptions->arguments, "[DEVICE] OBJECT...")->required();
  getting->add_option("-d,--directory", getOptions->folder, "Where to put them")->capture_default_str();
  getting->add_flag("--force", getOptions->force, "Replace files that are there already");
  getting->callback([&common, &exitCode, getOptions] { exitCode = get(common, *getOptions); });

  CLI::App* importing =
      addServiceCommand(app, common, "import", "Copy everything that has not been imported yet");
  const auto options = std::make_shared<ImportOptions>();
  importing->add_option("DEVICE", options->device, "Which device");
  importing->add_option("-d,--directory", options->folder, "Where to put the files")->required();
  importing->add_option(
      "--receipt", options->receipt,
      "What has been imported, a line for each file; import-receipt.jsonl in the folder when "
      "left out. Folders that share one share the memory too");
  importing->add_flag("--no-verify", options->noVerify,
                      "Do not compare what is on the disk with what was read from the card");
  importing->footer(
      "A file counts as imported when the receipt has one of the same card, size, times and beginning, "
      "whatever "
      "its name. A name that is taken by another file gets a number. Nothing has its own name before all of "
      "it is "
      "on the disk; an import that was interrupted goes on where it stopped.");
  importing->callback([&common, &exitCode, options] { exitCode = importAll(common, *options); });
}

}  // namespace brivoctl
