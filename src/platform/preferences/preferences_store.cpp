// SPDX-License-Identifier: MIT
#include "platform/preferences/preferences_store.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "platform/base/paths.h"
#include "platform/base/unique_fd.h"
#include "platform/preferences/property_list.h"

namespace brivo {

namespace {

constexpr std::size_t kLargestFile = 1 << 20;

bool writeAll(int fd, std::string_view text) {
  while (!text.empty()) {
    const ssize_t written = ::write(fd, text.data(), text.size());
    if (written < 0 && errno != EINTR) return false;
    if (written > 0) text.remove_prefix(static_cast<std::size_t>(written));
  }
  return true;
}

}  // namespace

std::optional<Dictionary> readPropertyListFile(const std::string& path) {
  const UniqueFd fd(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
  std::string text(kLargestFile + 1, '\0');
  std::size_t size = 0;
  while (fd && size < text.size()) {
    const ssize_t count = ::read(fd.get(), text.data() + size, text.size() - size);
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) return std::nullopt;
    if (count == 0) break;
    size += static_cast<std::size_t>(count);
  }
  if (!fd || size > kLargestFile) return std::nullopt;
  return parsePropertyList(std::string_view(text).substr(0, size));
}

std::string PreferencesStore::pathOf(const std::string& domain) const {
  return appendingPathComponent(folder_, domain + ".plist");
}

Dictionary PreferencesStore::read(const std::string& domain) const {
  return readPropertyListFile(pathOf(domain)).value_or(Dictionary());
}

std::optional<SystemError> PreferencesStore::write(const std::string& domain,
                                                   const Dictionary& preferences) const {
  ::mkdir(folder_.c_str(), 0700);  // when it fails, so does what follows
  const std::string path = pathOf(domain);
  std::string temporary = path + ".XXXXXX";
  const UniqueFd fd(::mkostemp(temporary.data(), O_CLOEXEC));
  if (!fd) return SystemError{"create " + temporary, errno};
  if (!writeAll(fd.get(), formatPropertyList(preferences)) || ::fsync(fd.get()) != 0 ||
      ::rename(temporary.c_str(), path.c_str()) != 0) {
    const SystemError error{"write " + path, errno};
    ::unlink(temporary.c_str());
    return error;
  }
  return std::nullopt;
}

}  // namespace brivo
