// SPDX-License-Identifier: MIT
#include "platform/volumes/mount_table.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <optional>

#include "platform/base/paths.h"

namespace brivo {

namespace {

/// Takes the part before the next `separator` off `text`.
std::string_view nextField(std::string_view& text, char separator) {
  const auto end = text.find(separator);
  const std::string_view field = text.substr(0, end);
  text = end == std::string_view::npos ? std::string_view() : text.substr(end + 1);
  return field;
}

template <class Number>
bool parseNumber(std::string_view text, Number& number) {
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  return error == std::errc() && end == text.data() + text.size();
}

/// Undoes the kernel's \ooo escapes.
std::string unescaped(std::string_view field) {
  std::string plain;
  const auto digit = [&](std::size_t i) { return i < field.size() && field[i] >= '0' && field[i] <= '7'; };
  for (std::size_t i = 0; i < field.size(); ++i) {
    if (field[i] == '\\' && digit(i + 1) && digit(i + 2) && digit(i + 3)) {
      const int byte = (field[i + 1] - '0') * 64 + (field[i + 2] - '0') * 8 + (field[i + 3] - '0');
      plain += static_cast<char>(byte);
      i += 3;
    } else {
      plain += field[i];
    }
  }
  return plain;
}

bool saysReadOnly(std::string_view options) {
  while (!options.empty()) {
    if (nextField(options, ',') == "ro") return true;
  }
  return false;
}

std::optional<Mount> parseLine(std::string_view line) {
  Mount mount;
  // Field 7 is a list of any length that ends with a lone "-".
  const auto dash = line.find(" - ");
  if (dash == std::string_view::npos) return std::nullopt;
  std::string_view rest = line.substr(dash + 3);
  line = line.substr(0, dash);
  const bool numbers = parseNumber(nextField(line, ' '), mount.id);
  nextField(line, ' ');  // the parent mount
  std::string_view device = nextField(line, ' ');
  if (!numbers || !parseNumber(nextField(device, ':'), mount.major) || !parseNumber(device, mount.minor)) {
    return std::nullopt;
  }
  mount.root = unescaped(nextField(line, ' '));
  mount.point = unescaped(nextField(line, ' '));
  mount.readOnly = saysReadOnly(nextField(line, ' '));
  mount.type = unescaped(nextField(rest, ' '));
  mount.source = unescaped(nextField(rest, ' '));
  mount.readOnly = saysReadOnly(nextField(rest, ' ')) || mount.readOnly;
  if (!mount.point.starts_with('/') || mount.type.empty()) return std::nullopt;
  return mount;
}

/// FUSE file systems whose files are on other machines or nowhere.
constexpr std::array<std::string_view, 16> kForeignFuse{
    "fuse.sshfs",          "fuse.rclone", "fuse.s3fs",     "fuse.curlftpfs",  "fuse.davfs",  "fuse.glusterfs",
    "fuse.ceph-fuse",      "fuse.goofys", "fuse.gcsfuse",  "fuse.gvfsd-fuse", "fuse.portal", "fuse.lxcfs",
    "fuse.vmware-vmblock", "fuse.encfs",  "fuse.mergerfs", "fuse.snapfuse"};

/// True for file systems that keep files of their own on this machine.
bool holdsFiles(const Mount& mount) {
  if (mount.type.starts_with("fuse."))
    return std::ranges::find(kForeignFuse, mount.type) == kForeignFuse.end();
  // File systems without a block device have device numbers with major 0; btrfs has, too, but names its
  // device.
  return mount.major != 0 || mount.source.starts_with("/dev/");
}

bool sameFileSystem(const Mount& a, const Mount& b) { return a.major == b.major && a.minor == b.minor; }

}  // namespace

std::vector<Mount> parseMountTable(std::string_view mountinfo) {
  std::vector<Mount> table;
  while (!mountinfo.empty()) {
    if (auto mount = parseLine(nextField(mountinfo, '\n'))) table.push_back(std::move(*mount));
  }
  return table;
}

std::vector<Mount> volumeMounts(const std::vector<Mount>& table, const std::vector<std::string>& roots) {
  std::vector<Mount> volumes;
  for (auto mount = table.begin(); mount != table.end(); ++mount) {
    const auto isBelow = [&](const std::string& root) { return isAtOrBelow(mount->point, root); };
    const auto isSame = [&](const Mount& other) { return sameFileSystem(*mount, other); };
    const auto hidesIt = [&](const Mount& other) { return other.point == mount->point; };
    if (mount->point != "/" && std::ranges::any_of(roots, isBelow) && holdsFiles(*mount) &&
        std::none_of(table.begin(), mount, isSame) && std::none_of(std::next(mount), table.end(), hidesIt)) {
      volumes.push_back(*mount);
    }
  }
  return volumes;
}

const Mount* mountOf(const std::vector<Mount>& table, std::string_view path) {
  const Mount* found = nullptr;
  for (const Mount& mount : table) {
    const bool deeper =
        !found || mount.point.size() >= found->point.size();  // of two at one place, the later
    if (deeper && isAtOrBelow(path, mount.point)) found = &mount;
  }
  return found;
}

}  // namespace brivo
