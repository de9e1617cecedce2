// SPDX-License-Identifier: MIT
#include "content/folder_walk.h"

#include <algorithm>
#include <chrono>

#include "content/dcf_names.h"
#include "content/grouping.h"
#include "content/media/brivo_file.h"
#include "platform/base/paths.h"
#include "platform/text/unicode.h"
#include "protocol/keys.h"
#include "util/clocks.h"
#include "util/log.h"

namespace brivo {

namespace {

/// Enough to make the hand-over between steps cheap, few enough to let others in.
constexpr int kGroupsPerStep = 64;
/// A step ends after the group that takes it beyond this: movies can take long.
constexpr std::chrono::milliseconds kStepTime{20};
constexpr std::int64_t kOldestFirst = -1;

constexpr std::size_t kLongestDumpedName = 18;
constexpr std::size_t kKeptOfDumpedName = 17;

}  // namespace

void sortEntries(std::vector<DirectoryEntry>& entries, std::int64_t chronologicalOrder) {
  std::ranges::sort(entries, [=](const DirectoryEntry& a, const DirectoryEntry& b) {
    const FileTime& first = a.values.modified;
    const FileTime& second = b.values.modified;
    if (chronologicalOrder != 0 && first != second)
      return chronologicalOrder < 0 ? first < second : second < first;
    return a.name < b.name;
  });
}

void FolderWalk::start(std::shared_ptr<BrivoFolder> folder, const Dictionary& options) {
  CameraDevice& device = folder->device();
  const std::shared_ptr<FolderWalk> walk(new FolderWalk(std::move(folder), options));
  device.enumerateConcurrently([walk] { walk->step(); });
}

FolderWalk::FolderWalk(std::shared_ptr<BrivoFolder> folder, const Dictionary& options)
    : folder_(std::move(folder)), device_(folder_->device().weak_from_this()), options_(options) {}

void FolderWalk::step() {
  const auto device = device_.lock();
  if (!device) return;
  if (!begun_) {
    begin(*device);
  } else {
    enumerateSomeGroups(*device);
  }
}

void FolderWalk::begin(CameraDevice& device) {
  begun_ = true;
  startBenchmark();
  const auto order = options_.signedInteger(keys::kEnumerationChronologicalOrder).value_or(kOldestFirst);
  auto listed = device.files().entries(folder_->path());
  std::vector<DirectoryEntry> entries = listed.ok() ? *std::move(listed) : std::vector<DirectoryEntry>();
  sortEntries(entries, order);
  OVLog(folder_->name(), "--> Entering Enumeration");
  groups_ = copyGroupIntoDictionary(std::move(entries), [](const DirectoryEntry& entry) {
    return std::optional<std::string>(baseName(entry.name));
  });
  enumerateSomeGroups(device);
}

void FolderWalk::enumerateSomeGroups(CameraDevice& device) {
  const auto end = std::chrono::steady_clock::now() + kStepTime;
  for (int i = 0; i < kGroupsPerStep && nextGroup_ < groups_.size(); ++i) {
    Group group = std::move(groups_[nextGroup_++]);
    enumerate(group);
    if (std::chrono::steady_clock::now() >= end) break;
  }
  if (nextGroup_ < groups_.size()) {
    continueLater(device);
  } else {
    finish();
  }
}

void FolderWalk::continueLater(CameraDevice& device) {
  device.enumerateWhenClientsKeepUp([walk = shared_from_this()] { walk->step(); });
}

void FolderWalk::enumerate(Group& group) {
  Array batch(Array::Kind::data);
  for (const DirectoryEntry& entry : group) {
    if (folder_->isMediaRoot()) {
      enumerateMediaRootEntry(entry);
    } else {
      enumerateFolderEntry(entry, batch);
    }
  }
  if (!batch.empty()) folder_->flushNotifications(std::move(batch));
}

void FolderWalk::enumerateMediaRootEntry(const DirectoryEntry& entry) {
  if (!entry.values.directory || !_ValidDCFObjectName(entry.name, DCFKind::folder)) {
    return dump(entry.name, "DCIM can only contain subdirectories");
  }
  CameraDevice& device = folder_->device();
  const auto subFolder = BrivoFolder::initWithFSURL(appendingPathComponent(folder_->path(), entry.name),
                                                    entry.name, folder_.get(), device, &entry.values);
  if (!subFolder) return;
  device.addCameraFolderToIndex(subFolder);
  subFolder->announce();
  subFolder->enumerateContentWithOptions(options_);
}

void FolderWalk::enumerateFolderEntry(const DirectoryEntry& entry, Array& batch) {
  if (entry.values.directory || !_ValidDCFObjectName(entry.name, DCFKind::file)) {
    return dump(entry.name, "SUBDIR can only contain images");
  }
  if (!entry.hasValues) return;  // a link, a FIFO, or gone by now: no item can be made of it
  const auto file = folder_->newItemWithFSURL(appendingPathComponent(folder_->path(), entry.name), entry.name,
                                              false, &entry.values);
  if (file) batch.append(file->info().content());
}

void FolderWalk::dump(std::string_view name, const char* reason) {
  ++dumpCount_;
  const std::string shown = replacingInvalidUtf8(name);
  const bool cut = codePointCount(shown) > kLongestDumpedName;
  OVLogVerboseOrDebug(kLogTypeContent, folder_->name(), "Dumped: [{:>18}] - {}",
                      cut ? codePointPrefix(shown, kKeptOfDumpedName) : std::string_view(shown), reason);
}

void FolderWalk::finish() {
  if (dumpCount_ != 0) OVLog(folder_->name(), "[{:05}] Non-compliant DCF objects", dumpCount_);
  OVLog(folder_->name(), "{}", benchmarkLine("Total Enumeration Time", stopBenchmark()));
}

}  // namespace brivo
