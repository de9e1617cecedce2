// SPDX-License-Identifier: MIT
#include "device/object_requests.h"

#include <algorithm>

#include "platform/base/memory_file.h"
#include "protocol/keys.h"
#include "protocol/result_codes.h"
#include "util/log.h"

namespace brivo {

namespace {

/// From here on bytes are read straight into the memory that travels to the client.
constexpr std::uint64_t kTravellingMemory = 65'536;

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

/// The first `count` bytes of a fresh buffer; empty for a read that failed.
std::size_t usable(std::int64_t count) { return count > 0 ? static_cast<std::size_t>(count) : 0; }

Data readIntoMemoryFile(const BrivoFile& file, std::uint64_t offset, std::uint64_t length) {
  auto memory = MemoryFile::create("brivod-read", length);
  if (!memory) return {};
  const std::size_t count = usable(file.readStream(memory->bytes(), offset));
  if (count == 0) return {};
  return std::move(*memory).seal(count).value_or(Data());
}

Data readIntoBuffer(const BrivoFile& file, std::uint64_t offset, std::uint64_t length) {
  std::vector<std::byte> buffer(length);
  buffer.resize(usable(file.readStream(buffer, offset)));
  return Data(std::move(buffer));
}

}  // namespace

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
  if (open) {
    OVLog(nameOf(item), "OVReadBufferStreamOpen: {}", size);
    if (file) openStream(file, client);
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
  const Data data = range.code == kResultSuccess && file ? read(*file, range) : Data();
  Dictionary result = options;
  result.set(keys::kReadData, data);
  result.set(keys::kErrorCode, range.code);
  reply(std::move(result));
  if (data.empty()) return;
  const std::uint64_t delivered = range.offset + data.size();
  notifications_.sendNotificationDownloadProgressForObject(
      file->objHandle(), delivered, static_cast<double>(delivered) / static_cast<double>(size) * 100.0);
}

Data ObjectRequests::read(BrivoFile& file, const Range& range) const {
  if (!file.openStream()) return {};
  Data data = range.length < kTravellingMemory ? readIntoBuffer(file, range.offset, range.length)
                                               : readIntoMemoryFile(file, range.offset, range.length);
  file.closeStream();
  return data;
}

void ObjectRequests::requestDeleteObjectHandle(std::uint64_t handle, const Dictionary& options,
                                               const ResultHandler& reply) {
  const auto item = index_.cameraItemWithObjectID(handle);
  OVLog("delete", "Brivo - {}", nameOf(item));
  // An unknown handle is what a deleted object has.
  const bool deleted = !item || index_.deleteFile(item);
  Dictionary result = withErrorCode(options, deleted ? kResultSuccess : kResultDeleteFailed);
  OVLog("delete", "Brivo reply - {}", describe(result));
  reply(std::move(result));
}

void ObjectRequests::openStream(const std::shared_ptr<BrivoFile>& file, std::int32_t client) {
  if (file->openStream()) openStreams_.emplace(client, file);
}

/// A client closes what it opened itself, and not the streams of others.
void ObjectRequests::closeStream(const std::shared_ptr<BrivoFile>& file, std::int32_t client) {
  const auto [first, last] = openStreams_.equal_range(client);
  const auto own = std::find_if(first, last, [&](const auto& entry) { return entry.second == file; });
  if (own == last) return;
  openStreams_.erase(own);
  file->closeStream();
}

void ObjectRequests::closeStreamsOf(std::int32_t client) {
  const auto [first, last] = openStreams_.equal_range(client);
  for (auto stream = first; stream != last; ++stream) stream->second->closeStream();
  openStreams_.erase(first, last);
}

}  // namespace brivo
