// SPDX-License-Identifier: MIT
#include "platform/volumes/monitor_thread.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <sys/inotify.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <utility>

#include "platform/base/paths.h"
#include "platform/volumes/mount_table.h"
#include "platform/work/thread_name.h"

namespace brivo {

namespace {

constexpr std::uint32_t kFolderEvents =
    IN_CREATE | IN_DELETE | IN_MOVED_FROM | IN_MOVED_TO | IN_DELETE_SELF | IN_MOVE_SELF | IN_ONLYDIR;

void wakeUp(const UniqueFd& eventFd) {
  constexpr std::uint64_t one = 1;
  (void)!::write(eventFd.get(), &one, sizeof one);
}

std::string readWhole(int fd) {
  std::string text;
  char buffer[16384];
  ssize_t count = 0;
  while ((count = ::pread(fd, buffer, sizeof buffer, static_cast<off_t>(text.size()))) > 0) {
    text.append(buffer, static_cast<std::size_t>(count));
  }
  return text;
}

std::string canonical(const std::string& path) {
  const std::unique_ptr<char, decltype(&std::free)> resolved(::realpath(path.c_str(), nullptr), &std::free);
  return resolved ? resolved.get() : path;
}

}  // namespace

MonitorThread::MonitorThread(Pool& pool, std::vector<std::string> roots, std::vector<std::string> folders,
                             DomainChangeHandler handler)
    : pool_(pool),
      roots_(std::move(roots)),
      folders_(std::move(folders)),
      handler_(std::move(handler)),
      inbox_(std::make_shared<Inbox>()) {}

MonitorThread::~MonitorThread() {
  if (!thread_.joinable()) return;
  {
    const MutexLock lock(inbox_->mutex);
    inbox_->ending = true;
  }
  wakeUp(inbox_->wake);
  thread_.join();
}

std::optional<SystemError> MonitorThread::start() {
  inbox_->wake.reset(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK));
  inbox_->inotify.reset(::inotify_init1(IN_CLOEXEC | IN_NONBLOCK));
  mountinfo_.reset(::open("/proc/self/mountinfo", O_RDONLY | O_CLOEXEC));
  if (!inbox_->wake || !inbox_->inotify) return SystemError{"watch folders", errno};
  if (!mountinfo_) return SystemError{"read /proc/self/mountinfo", errno};
  thread_ = std::thread([this] { run(); });
  const auto deadline = Clock::now() + kPromptTime;
  mutex_.lock();
  while (!allAnswered_ && answered_.wait_until(mutex_, deadline) != std::cv_status::timeout) {
  }
  mutex_.unlock();
  return std::nullopt;
}

void MonitorThread::run() {
  setThreadName("volumes");
  while (true) {
    if (rescanNow_) rescan();
    announceWhenAllAnswered();
    wait();
    {
      const MutexLock lock(inbox_->mutex);
      if (inbox_->ending) return;
    }
    takeFindings();
  }
}

/// Sleeps until there is something to do, and notes what it is.
void MonitorThread::wait() {
  pollfd sources[] = {
      {mountinfo_.get(), POLLPRI, 0}, {inbox_->inotify.get(), POLLIN, 0}, {inbox_->wake.get(), POLLIN, 0}};
  int timeout = -1;
  if (settled_) {
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(*settled_ - Clock::now());
    timeout = static_cast<int>(std::max<std::int64_t>(0, left.count()));
  }
  ::poll(sources, std::size(sources), timeout);
  if (sources[0].revents != 0) rescanNow_ = true;  // POLLERR is how the table says that it changed
  if (sources[1].revents != 0) readInotify();
  if (sources[2].revents != 0) {
    std::uint64_t count = 0;
    (void)!::read(inbox_->wake.get(), &count, sizeof count);
  }
  if (settled_ && Clock::now() >= *settled_) {
    settled_.reset();
    rescanNow_ = true;
  }
}

/// Events are hints to look again, nothing more: they come late, in part, and not at all for some changes.
void MonitorThread::readInotify() {
  alignas(inotify_event) char buffer[16384];
  const ssize_t size = ::read(inbox_->inotify.get(), buffer, sizeof buffer);
  for (ssize_t at = 0; at < size;) {
    inotify_event event{};
    std::memcpy(&event, buffer + at, sizeof event);
    at += static_cast<ssize_t>(sizeof event + event.len);
    if ((event.mask & IN_Q_OVERFLOW) != 0) {
      for (const auto& [path, volume] : volumes_) touched_.insert(volume.watch);
    } else if ((event.mask & IN_IGNORED) != 0) {
      folderWatches_.erase(event.wd);
    } else {
      touched_.insert(event.wd);
    }
  }
  if (!settled_) settled_ = Clock::now() + kSettleTime;
}

std::vector<VolumeCandidate> MonitorThread::candidates() const {
  auto found = mountedCandidates(parseMountTable(readWhole(mountinfo_.get())), roots_);
  for (const std::string& folder : folders_) {
    for (VolumeCandidate& candidate : folderCandidates(canonical(folder))) {
      const auto isSame = [&](const VolumeCandidate& other) { return other.path == candidate.path; };
      if (std::ranges::none_of(found, isSame)) found.push_back(std::move(candidate));
    }
  }
  return found;
}

/// The folders themselves and those that hold them, so that one that is made or replaced later is seen.
void MonitorThread::watchFolders() {
  for (const std::string& folder : folders_) {
    for (const std::string& watched : {canonical(folder), std::string(parentPath(folder))}) {
      const int watch = ::inotify_add_watch(inbox_->inotify.get(), watched.c_str(), kFolderEvents);
      if (watch >= 0) folderWatches_.insert(watch);
    }
  }
}

void MonitorThread::rescan() {
  rescanNow_ = false;
  watchFolders();  // before the look, so that nothing falls between
  const std::vector<VolumeCandidate> now = candidates();
  const auto isThere = [&](const VolumeCandidate& known) {
    return std::ranges::any_of(now, [&](const VolumeCandidate& candidate) {
      return candidate.path == known.path && candidate.identity == known.identity;
    });
  };
  std::vector<std::string> gone;
  for (const auto& [path, volume] : volumes_) {
    if (!isThere(volume.candidate)) gone.push_back(path);
  }
  for (const std::string& path : gone) forget(path);
  for (const VolumeCandidate& candidate : now) {
    const auto [entry, isNew] = volumes_.try_emplace(candidate.path);
    if (isNew) entry->second.candidate = candidate;
    if (isNew || touched_.contains(entry->second.watch)) look(entry->second);
  }
  touched_.clear();
}

/// Each volume that goes is a change of its own: whoever listens need not cope with several at once.
void MonitorThread::forget(const std::string& path) {
  const auto entry = volumes_.find(path);
  const bool wasReported = entry->second.containsPhotos.value_or(false);
  if (entry->second.watch >= 0) ::inotify_rm_watch(inbox_->inotify.get(), entry->second.watch);
  volumes_.erase(entry);
  if (wasReported) report();
}

void MonitorThread::look(Volume& volume) {
  if (std::exchange(volume.looking, true)) {
    volume.lookAgain = true;
    return;
  }
  pool_.post([inbox = inbox_, path = volume.candidate.path, identity = volume.candidate.identity] {
    // A watch does not keep a volume busy. It is set before the look, so that nothing falls between.
    constexpr std::uint32_t events =
        IN_CREATE | IN_DELETE | IN_MOVED_FROM | IN_MOVED_TO | IN_ONLYDIR | IN_DONT_FOLLOW;
    const int watch = ::inotify_add_watch(inbox->inotify.get(), path.c_str(), events);
    const bool photos = containsPhotos(path);
    {
      const MutexLock lock(inbox->mutex);
      inbox->findings.push_back({path, identity, photos, watch});
    }
    wakeUp(inbox->wake);
  });
}

void MonitorThread::takeFindings() {
  std::vector<Finding> findings;
  {
    const MutexLock lock(inbox_->mutex);
    findings.swap(inbox_->findings);
  }
  bool added = false;
  for (const Finding& finding : findings) {
    const auto entry = volumes_.find(finding.path);
    if (entry == volumes_.end() || entry->second.candidate.identity != finding.identity) continue;
    Volume& volume = entry->second;
    volume.watch = finding.watch;
    volume.looking = false;
    const bool had = std::exchange(volume.containsPhotos, finding.containsPhotos).value_or(false);
    if (had && !finding.containsPhotos) report();
    added = added || (!had && finding.containsPhotos);
    if (std::exchange(volume.lookAgain, false)) look(volume);
  }
  if (added) report();
}

void MonitorThread::report() {
  std::map<std::string, StorageDomain> domains;
  for (const auto& [path, volume] : volumes_) {
    if (!volume.containsPhotos) continue;
    StorageDomain domain;
    domain.identifier = volume.candidate.description + " " + path;
    domain.containsPhotos = *volume.containsPhotos;
    domain.storageURLs = {Url::file(path)};
    domains.emplace(domain.identifier, std::move(domain));
  }
  handler_(domains);
}

void MonitorThread::announceWhenAllAnswered() {
  const auto hasAnswered = [](const auto& entry) { return entry.second.containsPhotos.has_value(); };
  if (!std::ranges::all_of(volumes_, hasAnswered)) return;
  const MutexLock lock(mutex_);
  if (std::exchange(allAnswered_, true)) return;
  answered_.notify_all();
}

}  // namespace brivo
