// SPDX-License-Identifier: MIT
#include "support/mounts.h"

#include <fcntl.h>
#include <sched.h>
#include <sys/mount.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <stdexcept>

namespace brivo::test {

namespace {

void check(bool ok, const std::string& what) {
  if (!ok) throw std::runtime_error(what + ": " + std::strerror(errno));
}

void run(const std::string& command) {
  if (std::system(command.c_str()) != 0) throw std::runtime_error("failed: " + command);
}

}  // namespace

bool enterMountNamespace() {
  static const bool entered = ::geteuid() == 0 && ::unshare(CLONE_NEWNS) == 0 &&
                              ::mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0;
  return entered;
}

LoopMount::LoopMount(const std::string& point, int megabytes) : point_(point) {
  makeFolder(point);
  const std::string image = image_ / "image";
  run("truncate -s " + std::to_string(megabytes) + "M " + image + " && mkfs.ext4 -q " + image +
      " && mount -o loop " + image + " '" + point + "'");
  mounted_ = true;
}

LoopMount::~LoopMount() {
  if (mounted_) ::umount2(point_.c_str(), MNT_DETACH);
}

bool LoopMount::unmount() {
  if (mounted_ && ::umount(point_.c_str()) == 0) mounted_ = false;
  return !mounted_;
}

void LoopMount::yank() const { std::filesystem::resize_file(image_ / "image", 0); }

HungMount::HungMount(const std::string& point)
    : point_(point), server_(::open("/dev/fuse", O_RDWR | O_CLOEXEC)) {
  makeFolder(point);
  check(server_.get() >= 0, "open /dev/fuse");
  const std::string options = "fd=" + std::to_string(server_.get()) + ",rootmode=40000,user_id=0,group_id=0";
  check(::mount("hung", point.c_str(), "fuse.hung", MS_NOSUID | MS_NODEV, options.c_str()) == 0,
        "mount fuse.hung");
}

HungMount::~HungMount() {
  server_.reset();  // everybody who waits gets an error
  ::umount2(point_.c_str(), MNT_DETACH);
}

void mountAt(const std::string& source, const std::string& point, const char* type) {
  makeFolder(point);
  check(::mount(source.c_str(), point.c_str(), type, 0, nullptr) == 0, "mount " + point);
}

void bindMount(const std::string& from, const std::string& point) {
  makeFolder(point);
  check(::mount(from.c_str(), point.c_str(), nullptr, MS_BIND, nullptr) == 0, "bind " + point);
}

void unmountAt(const std::string& point) { check(::umount(point.c_str()) == 0, "unmount " + point); }

}  // namespace brivo::test
