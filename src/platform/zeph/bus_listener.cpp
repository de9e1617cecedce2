// SPDX-License-Identifier: MIT
#include "platform/zeph/bus_listener.h"

#include <fmt/format.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <utility>

#include "platform/zeph/address.h"
#include "platform/zeph/pass_rights.h"

namespace brivo::zeph {

namespace {

constexpr int kAcceptsPerTurn = 64;
constexpr std::chrono::milliseconds kPauseWithoutDescriptors{100};

/// Clients are told apart by their process identifiers; one that has none here would be taken for all others.
bool mayConnect(const AuditToken& peer) {
  if (peer.processIdentifier() <= 0) return false;
  const uid_t own = ::getuid();
  return own == 0 || peer.userIdentifier() == own || peer.userIdentifier() == 0;
}

/// Where nobody looks for it.
std::string hiddenName(const std::string& path) { return path + "~"; }

}  // namespace

Result<UniqueFd> BusListener::bind(const std::string& path) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  // Under its own name it appears when it listens: whoever sees it can connect.
  const std::string before = hiddenName(path);
  if (before.size() >= sizeof address.sun_path) return SystemError{"socket path too long: " + path};
  std::memcpy(address.sun_path, before.c_str(), before.size() + 1);
  UniqueFd socket(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
  if (!socket) return SystemError{"make a socket", errno};
  ::unlink(before.c_str());
  // The folder is closed to others; the mode matters to those who look at it.
  if (::bind(socket.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0 ||
      ::chmod(before.c_str(), 0600) != 0 || ::listen(socket.get(), kBacklog) != 0 ||
      ::rename(before.c_str(), path.c_str()) != 0) {
    return SystemError{"listen at " + path, errno};
  }
  refuseDescriptors(socket);
  return socket;
}

void BusListener::refuseDescriptors(const UniqueFd& socket) {
  constexpr int no = 0;
  ::setsockopt(socket.get(), SOL_SOCKET, SO_PASSRIGHTS, &no, sizeof no);
}

BusListener::BusListener(std::shared_ptr<RunLoop> loop, ListenerHost& host,
                         std::shared_ptr<SerialQueue> queue, UniqueFd socket, std::string path, bool ownsFile)
    : loop_(std::move(loop)),
      host_(host),
      queue_(std::move(queue)),
      path_(std::move(path)),
      ownsFile_(ownsFile),
      endpoint_(endpointForPath(path_)),
      socket_(std::move(socket)) {}

BusListener::~BusListener() = default;

void BusListener::setDelegate(std::weak_ptr<ListenerDelegate> delegate) {
  const MutexLock lock(mutex_);
  delegate_ = std::move(delegate);
}

void BusListener::resume() {
  loop_->post([self = shared_from_this()] {
    if (!self->socket_ || self->source_) return;
    self->listening_ = self;
    const auto onConnect = [](sd_event_source*, int, std::uint32_t, void* listener) {
      static_cast<BusListener*>(listener)->accept();
      return 0;
    };
    sd_event_add_io(self->loop_->event(), &self->source_, self->socket_.get(), EPOLLIN, onConnect,
                    self.get());
  });
}

void BusListener::invalidate() {
  {
    const MutexLock lock(mutex_);
    if (std::exchange(fileIsGone_, true)) return;
  }
  if (ownsFile_) ::unlink(path_.c_str());
  loop_->post([self = shared_from_this()] {
    if (self->isHidden_) ::unlink(hiddenName(self->path_).c_str());
    self->source_ = sd_event_source_disable_unref(self->source_);
    self->socket_.reset();
    self->listening_.reset();
  });
}

void BusListener::stopAccepting() {
  if (ownsFile_ && source_ && ::rename(path_.c_str(), hiddenName(path_).c_str()) == 0) {
    isHidden_ = true;
    accept();
  }
  setAccepting(false);
}

void BusListener::goOnAccepting() {
  if (std::exchange(isHidden_, false)) ::rename(hiddenName(path_).c_str(), path_.c_str());
  setAccepting(true);
}

void BusListener::setAccepting(bool accepting) {
  if (source_) sd_event_source_set_enabled(source_, accepting ? SD_EVENT_ON : SD_EVENT_OFF);
}

void BusListener::accept() {
  for (int i = 0; i < kAcceptsPerTurn && undecided_ < kMostUndecided; ++i) {
    UniqueFd socket(::accept4(socket_.get(), nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
    if (socket) {
      take(std::move(socket));
    } else if (errno == EMFILE || errno == ENFILE || errno == ENOMEM || errno == ENOBUFS) {
      host_.fault(fmt::format("cannot accept a connection: {}", std::strerror(errno)));
      setAccepting(false);
      loop_->postAfter(kPauseWithoutDescriptors, [self = shared_from_this()] { self->setAccepting(true); });
      return;
    } else if (errno != EINTR && errno != ECONNABORTED) {
      return;
    }
  }
  if (undecided_ >= kMostUndecided) setAccepting(false);
}

void BusListener::take(UniqueFd socket) {
  const AuditToken peer = AuditToken::ofPeer(socket.get());
  if (!mayConnect(peer)) {
    host_.fault(fmt::format("process {} of user {} may not connect", peer.processIdentifier(),
                            peer.userIdentifier()));
    return;
  }
  letDecide(std::move(socket), peer);
}

Result<std::weak_ptr<Connection>, CallError> BusListener::admit(UniqueFd socket, const AuditToken& peer) {
  if (!source_) return CallError{kErrorFailed, "Nobody listens any more"};
  if (!mayConnect(peer)) return CallError{kErrorAccessDenied, "Another user's clients are not served"};
  if (undecided_ >= kMostUndecided)
    return CallError{kErrorLimitsExceeded, "Too many clients connect at once"};
  refuseDescriptors(socket);
  return std::weak_ptr<Connection>(letDecide(std::move(socket), peer));
}

std::shared_ptr<Connection> BusListener::letDecide(UniqueFd socket, const AuditToken& peer) {
  ++undecided_;
  auto connection = host_.adopt(std::move(socket), peer);
  queue_->post([self = shared_from_this(), connection] {
    if (!self->decide(connection)) connection->invalidate();
    self->loop_->post([self] { self->decided(); });
  });
  return connection;
}

bool BusListener::decide(const std::shared_ptr<Connection>& connection) {
  std::shared_ptr<ListenerDelegate> delegate;
  {
    const MutexLock lock(mutex_);
    delegate = delegate_.lock();
  }
  return delegate && delegate->shouldAcceptNewConnection(*this, connection);
}

void BusListener::decided() {
  if (undecided_-- == kMostUndecided) setAccepting(true);
}

}  // namespace brivo::zeph
