// SPDX-License-Identifier: MIT
#include "device/content_enumeration.h"

#include <utility>

#include "content/dcf_names.h"
#include "platform/base/paths.h"
#include "protocol/keys.h"
#include "util/log.h"

namespace brivo {

void ContentEnumeration::enumerateContentWithOptions(const Dictionary& options,
                                                     const std::shared_ptr<zeph::Connection>& connection,
                                                     std::function<void()> done) {
  if (options.boolean(keys::kEnumerationPrioritizeSpeed).value_or(false)) prioritizeSpeed_ = true;
  auto progress = Progress::beginning;
  {
    const MutexLock lock(mutex_);
    progress = progress_;
    if (progress == Progress::beginning) {
      // The card is walked once: who comes meanwhile waits for the first, and is a later client then.
      waiting_.push_back({options, connection, std::move(done)});
      return;
    }
    if (progress == Progress::notBegun) progress_ = Progress::beginning;
  }
  if (progress == Progress::filledStorageCache) {
    enumerateAgain(connection);
    notifications_.sendNotificationContentCatalogPercentCompleted();
    done();
    return;
  }
  enumerateFirst(options);
  notifications_.sendNotificationContentCatalogPercentCompleted();
  std::vector<Caller> waiting;
  {
    const MutexLock lock(mutex_);
    // Before anybody has started using the device there is no store to fill: the next call is first again.
    progress_ = host_.store() ? Progress::filledStorageCache : Progress::notBegun;
    waiting.swap(waiting_);
  }
  done();
  for (Caller& caller : waiting) {
    enumerateContentWithOptions(caller.options, caller.connection, std::move(caller.done));
  }
}

void ContentEnumeration::enumerateFirst(const Dictionary& options) {
  const Store store = host_.store().value_or(Store());
  preflight(store);
  for (const std::string& mediaPath : store.mediaPaths) {
    const auto folder =
        BrivoFolder::initWithFSURL(appendingPathComponent(store.volumePath, mediaPath),
                                   std::string(lastPathComponent(mediaPath)), nullptr, device_);
    if (!folder) continue;
    index_.addCameraFolderToIndex(folder);
    folder->announce();
    folder->enumerateContentWithOptions(options);
  }
}

void ContentEnumeration::enumerateAgain(const std::shared_ptr<zeph::Connection>& connection) {
  counters_.setMsObjectCount(static_cast<std::int32_t>(counters_.enumeratedItemCount()));
  notifications_.sendDeviceIsReady();
  OVLog("enumerateContent", "Requested From:{}", connection->processIdentifier());
  host_.replayContents(connection);
}

void ContentEnumeration::preflight(const Store& store) {
  for (const std::string& mediaPath : store.mediaPaths) {
    counters_.incrementPreflightObjectCount(1);
    OVLog(store.name, "🗄 Store Added  - {:04} - [{:>8}]", 1, mediaPath);
    preflightFolder(store.name, appendingPathComponent(store.volumePath, mediaPath));
  }
  notifications_.sendDeviceIsReady();
}

void ContentEnumeration::preflightFolder(const std::string& tag, const std::string& path) {
  const auto names = device_.files().names(path);
  if (!names.ok()) return;
  for (const std::string& name : *names) {
    if (_ValidDCFObjectName(name, DCFKind::folder)) {
      preflightSubFolder(tag, appendingPathComponent(path, name), name);
    } else {
      OVLog(tag, "!DCF Folder: [{:>16}]", name);
    }
  }
}

void ContentEnumeration::preflightSubFolder(const std::string& tag, const std::string& path,
                                            const std::string& name) {
  std::int32_t files = 0;
  const auto names = device_.files().names(path);
  for (const std::string& file : names.ok() ? *names : std::vector<std::string>()) {
    if (_ValidDCFObjectName(file, DCFKind::file)) {
      ++files;
    } else {
      OVLog(tag, "!DCF File: [{:>16}]", file);
    }
  }
  counters_.incrementPreflightObjectCount(1 + files);
  OVLog(tag, "🗂 Folder Added - {:04} - [{:>8}]", 1, name);
  OVLog(tag, "🗳 Files Added  - {:04}", files);
}

}  // namespace brivo
