// SPDX-License-Identifier: MIT
#include "orvidcore/saved_file.h"

#include <algorithm>
#include <cerrno>
#include <vector>

#include "platform/base/paths.h"
#include "platform/digest/sha256.h"

namespace orvid {

namespace {

/// Less than this is read again sooner than somebody wonders what the hidden file is.
constexpr std::uint64_t kWorthKeeping = 16'777'216;

Error fileError(const brivo::SystemError& error) { return {ErrorKind::file, 0, error.text()}; }

Result<Done> outcome(const std::optional<brivo::SystemError>& error) {
  return error ? Result<Done>(fileError(*error)) : Result<Done>(Done());
}

/// The same for every try to save this object under this name, and for nothing else.
std::string partPath(const std::string& path, const ObjectInfo& object) {
  const auto folder = path.find('/') == std::string::npos ? std::string_view(".") : brivo::parentPath(path);
  const std::string identity =
      path + '\n' + object.path + '\n' + std::to_string(object.size) + '\n' + std::to_string(object.modified);
  return brivo::appendingPathComponent(folder, ".orvid-" + brivo::sha256Of(identity).substr(0, 16) + ".part");
}

}  // namespace

Result<SavedFile> SavedFile::open(const std::string& path, const ObjectInfo& object) {
  auto part = brivo::PartFile::open(partPath(path, object));
  if (!part.ok()) {
    if (part.error().code == EWOULDBLOCK)
      return Error{ErrorKind::file, 0, path + " is being saved by somebody else"};
    return fileError(part.error());
  }
  SavedFile file(path, *std::move(part));
  if (file.size() > object.size) {
    if (const auto emptied = file.startOver(); !emptied.ok()) return emptied.error();
  }
  if (const auto error = file.part_->reserve(object.size)) {
    file.giveUp(fileError(*error));
    return fileError(*error);
  }
  return file;
}

Result<Data> SavedFile::tail(std::size_t most) const {
  std::vector<std::byte> bytes(std::min<std::uint64_t>(most, size()));
  const auto count = part_->read(bytes, size() - bytes.size());
  if (!count.ok()) return fileError(count.error());
  bytes.resize(*count);
  return Data(std::move(bytes));
}

Result<Done> SavedFile::startOver() { return outcome(part_->truncate(0)); }

Result<Done> SavedFile::append(std::span<const std::byte> bytes) { return outcome(part_->append(bytes)); }

Result<Done> SavedFile::commit(std::uint64_t size) {
  if (part_->size() != size) return Error{ErrorKind::file, 0, path_ + " has not the size it should have"};
  if (const auto error = part_->synchronize()) return fileError(*error);
  return outcome(part_->publish(path_));
}

void SavedFile::giveUp(const Error& failure) {
  const bool mayPass = failure.kind == ErrorKind::disconnected || failure.kind == ErrorKind::timedOut;
  if (!mayPass || size() < kWorthKeeping) part_->discard();
}

}  // namespace orvid
