// SPDX-License-Identifier: MIT
#include "device/object_requests.h"

#include <algorithm>
#include <set>

#include "protocol/keys.h"
#include "protocol/result_codes.h"
#include "util/log.h"

namespace brivo {

namespace {

Dictionary errorResult(std::int32_t code) {
  Dictionary result;
  result.set(keys::kErrorCode, code);
  return result;
}

Dictionary withErrorCode(const Dictionary& options, std::int32_t code) {
  Dictionary result = options;
  result.set(keys::kErrorCode, code);
  return result;
}

std::string nameOf(const std::shared_ptr<BrivoItem>& item) { return item ? item->name() : std::string(); }

}  // namespace

ObjectRequests::ObjectRequests(ObjectIndex& index, const DeviceNotifications& notifications,
                               ReadMemory& memory)
    : index_(index), notifications_(notifications), memory_(memory) {}

void ObjectRequests::requestMetadataForObjectHandle(std::uint64_t handle, const Dictionary& options,
                                                    const ResultHandler& reply) {
  const auto item = index_.cameraItemWithObjectID(handle);
  OVLogVerboseOrDebug(kLogTypeContent, "", "Requesting Metadata: {}", nameOf(item));
  if (!item) return reply(errorResult(kResultNoSuchObject));
  item->metadataWithOptions(options, reply);
}

void ObjectRequests::requestThumbnailDataForObjectHandle(std::uint64_t handle, const Dictionary& options,
                                                         const ResultHandler& reply) {
  const auto item = index_.cameraItemWithObjectID(handle);
  OVLogVerbose(kLogTypeDetail, nameOf(item), "requestThumbnailDataForObjectHandle: {}", handle);
  if (!item) return reply(errorResult(kResultNoSuchObject));
  item->thumbnailDataWithOptions(options, reply);
}

void ObjectRequests::requestDownloadObjectHandle(const Dictionary& options, const ResultHandler& reply) {
  reply(withErrorCode(options, kResultDownloadNotOffered));
}

ObjectRequests::Range ObjectRequests::rangeOf(const Dictionary& options, std::uint64_t size) {
  const auto numberAt = [&](std::string_view key, std::uint64_t fallback) {
    return options.contains(key) ? options.unsignedInteger(key) : std::optional(fallback);
  };
  const auto offset = numberAt(keys::kReadOffset, 0);
  const auto length = numberAt(keys::kReadLength, size);
  if (!offset || !length) return {0, 0, kResultBadRange};  // no numbers at all
  if (*length > kLongestRead) return {*offset, *length, kResultReadTooLong};
  const bool inside = *length > 0 && *offset <= size && *length <= size - *offset;
  return {*offset, *length, inside ? kResultSuccess : kResultBadRange};
}

void ObjectRequests::requestReadDataFromObjectHandle(std::uint64_t handle, const Dictionary& options,
                                                     std::int32_t client, const ResultHandler& reply) {
  const auto item = index_.cameraItemWithObjectID(handle);
  const auto file = std::dynamic_pointer_cast<BrivoFile>(item);
  const std::uint64_t size = item ? item->size() : 0;
  const bool open = options.boolean(keys::kReadBufferStreamOpen).value_or(false);
  const bool close = options.boolean(keys::kReadBufferStreamClose).value_or(false);
  const Value* buffer = options.find(keys::kReadBuffer);
  if (open) {
    OVLog(nameOf(item), "OVReadBufferStreamOpen: {}", size);
    if (file) openStream(file, client, !buffer);
  }
  if (close) {
    OVLog(nameOf(item), "OVReadBufferStreamClose: {}", size);
    if (file) closeStream(file, client);
  }
  if (open || close) {
    Dictionary result;
    result.set(keys::kReadData, Data());
    result.set(keys::kErrorCode, kResultSuccess);
    return reply(std::move(result));
  }
  const Range range = rangeOf(options, size);
  Dictionary result = buffer ? readIntoBuffer(file.get(), range, options, *buffer, client)
                             : readRange(file.get(), range, options);
  const std::uint64_t count = buffer ? result.unsignedInteger(keys::kReadBufferCount).value_or(0)
                                     : result.data(keys::kReadData)->size();
  reply(std::move(result));
  if (count > 0) tellProgress(*file, range.offset + count);
}

Dictionary ObjectRequests::readRange(BrivoFile* file, const Range& range, const Dictionary& options) {
  Dictionary result = options;
  result.set(keys::kReadData, file && range.code == kResultSuccess ? read(*file, range) : Data());
  result.set(keys::kErrorCode, range.code);
  return result;
}

Dictionary ObjectRequests::readIntoBuffer(BrivoFile* file, Range range, const Dictionary& options,
                                          const Value& buffer, std::int32_t client) {
  std::uint64_t count = 0;
  if (file && range.code == kResultSuccess) {
    const auto* lent = buffer.get<SharedBuffer>();
    const auto memory = lent ? buffers_.memoryOf(*lent, client, range.length) : std::span<std::byte>();
    if (memory.empty()) {
      range.code = kResultBadRange;
    } else if (file->openStream()) {
      count = static_cast<std::uint64_t>(std::max<std::int64_t>(0, file->readStream(memory, range.offset)));
      file->closeStream();
    }
  }
  Dictionary result = options;
  result.remove(keys::kReadBuffer);
  result.set(keys::kReadData, Data());
  result.set(keys::kReadBufferCount, count);
  result.set(keys::kErrorCode, range.code);
  return result;
}

Data ObjectRequests::read(BrivoFile& file, const Range& range) {
  if (!file.openStream()) return {};
  Data data;
  if (OVBufferCache* cache = file.bufferCache()) {
    std::uint64_t size = 0;
    data = cache->consumeBufferAtOffset(range.offset, size).value_or(Data());
    cache->setConsumedOffset(static_cast<std::int64_t>(range.offset));
  } else {
    data = memory_.read(file, range.offset, static_cast<std::size_t>(range.length));
  }
  file.closeStream();
  return data;
}

void ObjectRequests::tellProgress(const BrivoFile& file, std::uint64_t delivered) const {
  notifications_.sendNotificationDownloadProgressForObject(
      file.objHandle(), delivered, static_cast<double>(delivered) / static_cast<double>(file.size()) * 100.0);
}

void ObjectRequests::requestDeleteObjectHandle(std::uint64_t handle, const Dictionary& options,
                                               const ResultHandler& reply) {
  const auto item = index_.cameraItemWithObjectID(handle);
  OVLog("delete", "Brivo - {}", nameOf(item));
  // An unknown handle is what a deleted object has.
  const bool deleted = !item || index_.deleteFile(item);
  if (deleted) closeStreamsOn(item.get());
  Dictionary result = withErrorCode(options, deleted ? kResultSuccess : kResultDeleteFailed);
  OVLog("delete", "Brivo reply - {}", describe(result));
  reply(std::move(result));
}

std::size_t ObjectRequests::cacheCount() const {
  std::set<const BrivoFile*> cached;
  for (const auto& [client, file] : openStreams_) {
    if (file->bufferCache()) cached.insert(file.get());
  }
  return cached.size();
}

void ObjectRequests::openStream(const std::shared_ptr<BrivoFile>& file, std::int32_t client, bool readAhead) {
  if (!file->openStream()) return;
  if (readAhead && (file->bufferCache() || cacheCount() < kMostCaches)) file->createBufferCache();
  openStreams_.emplace(client, file);
}

/// A client closes what it opened itself, and not the streams of others.
void ObjectRequests::closeStream(const std::shared_ptr<BrivoFile>& file, std::int32_t client) {
  const auto [first, last] = openStreams_.equal_range(client);
  const auto own = std::find_if(first, last, [&](const auto& entry) { return entry.second == file; });
  if (own == last) return;
  openStreams_.erase(own);
  file->closeStream();
  file->destroyBufferCache();
}

void ObjectRequests::closeStreamsOn(const BrivoItem* item) {
  for (auto stream = openStreams_.begin(); stream != openStreams_.end();) {
    const auto [client, file] = *stream++;
    if (file.get() == item) closeStream(file, client);
  }
}

void ObjectRequests::forgetClient(std::int32_t client) {
  while (openStreams_.contains(client)) {
    const std::shared_ptr<BrivoFile> file = openStreams_.find(client)->second;
    closeStream(file, client);
  }
  buffers_.forget(client);
  memory_.trim();
}

void ObjectRequests::closeAllStreams() {
  while (!openStreams_.empty()) forgetClient(openStreams_.begin()->first);
}

}  // namespace brivo
