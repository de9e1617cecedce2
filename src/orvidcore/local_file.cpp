// SPDX-License-Identifier: MIT
#include "orvidcore/local_file.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "platform/base/paths.h"
#include "platform/base/uuid.h"

namespace orvid {

namespace {

Error fileError(const std::string& what) { return {ErrorKind::file, 0, what + ": " + std::strerror(errno)}; }

}  // namespace

Result<std::unique_ptr<LocalFile>> LocalFile::create(const std::string& path) {
  const auto folder = path.find('/') == std::string::npos ? std::string_view(".") : brivo::parentPath(path);
  std::string temporary = brivo::appendingPathComponent(folder, ".orvid-" + brivo::randomUuidString());
  brivo::UniqueFd fd(::open(temporary.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0666));
  if (!fd) return fileError("create a file for " + path);
  return std::unique_ptr<LocalFile>(new LocalFile(path, std::move(temporary), std::move(fd)));
}

LocalFile::~LocalFile() {
  if (!temporary_.empty()) ::unlink(temporary_.c_str());
}

Result<Done> LocalFile::append(std::span<const std::byte> bytes) {
  while (!bytes.empty()) {
    const ssize_t written = ::write(fd_.get(), bytes.data(), bytes.size());
    if (written < 0 && errno != EINTR) return fileError("write " + path_);
    if (written > 0) bytes = bytes.subspan(static_cast<std::size_t>(written));
  }
  return Done();
}

Result<Done> LocalFile::commit() {
  if (::fsync(fd_.get()) != 0 || ::rename(temporary_.c_str(), path_.c_str()) != 0) {
    return fileError("write " + path_);
  }
  temporary_.clear();
  return Done();
}

}  // namespace orvid
