// SPDX-License-Identifier: MIT
#include "peer.h"

#include <fcntl.h>
#include <sched.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <stdexcept>

#include "support/wait.h"

namespace brivo::test {

namespace {

int checked(int result, const char* what) {
  if (result < 0) throw std::runtime_error(std::string(what) + ": " + std::strerror(errno));
  return result;
}

sockaddr* generic(sockaddr_storage& address) { return reinterpret_cast<sockaddr*>(&address); }

int resultOf(const std::function<int()>& body) {
  try {
    return body();
  } catch (const std::exception& error) {
    std::fprintf(stderr, "%s\n", error.what());
    return 100;
  }
}

int beAPeer(const ListeningSocket& socket, const std::function<bool()>& before,
            const std::function<bool(int)>& after) {
  ::prctl(PR_SET_PDEATHSIG, SIGKILL);
  if (before && !before()) return 2;
  ::prctl(PR_SET_PDEATHSIG, SIGKILL);  // again, for the case that it forked
  const int connection = socket.connect();
  if (connection < 0) return 3;
  if (after && !after(connection)) return 4;
  for (;;) ::pause();
}

bool writeTo(const std::string& path, const std::string& text) {
  const UniqueFd fd(::open(path.c_str(), O_WRONLY | O_CLOEXEC));
  return ::write(fd.get(), text.data(), text.size()) == static_cast<ssize_t>(text.size());
}

}  // namespace

ListeningSocket::ListeningSocket() : socket_(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
  address_.ss_family = AF_UNIX;
  checked(::bind(socket_.get(), generic(address_), sizeof address_.ss_family),
          "bind");  // the kernel names it
  const timeval limit{20, 0};
  ::setsockopt(socket_.get(), SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
  checked(::listen(socket_.get(), 8), "listen");
  checked(::getsockname(socket_.get(), generic(address_), &size_), "getsockname");
}

int ListeningSocket::connect() const {
  sockaddr_storage address = address_;
  const int fd = ::socket(AF_UNIX, SOCK_STREAM, 0);
  return ::connect(fd, generic(address), size_) == 0 ? fd : -1;
}

UniqueFd ListeningSocket::accept() const {
  return UniqueFd(checked(::accept4(socket_.get(), nullptr, nullptr, SOCK_CLOEXEC), "accept"));
}

Peer::Peer(const std::function<bool()>& before, const std::function<bool(int)>& after)
    : pid_(checked(::fork(), "fork")), token_(AuditToken::ofCredentials({})) {
  if (pid_ == 0) ::_exit(resultOf([&] { return beAPeer(socket_, before, after); }));
  connection_ = socket_.accept();
  token_ = AuditToken::ofPeer(connection_.get());
}

Peer::~Peer() {
  if (pid_ <= 0) return;
  kill();
  reap();
}

bool Peer::runs(const std::string& program) const {
  const std::string link = "/proc/" + std::to_string(pid_) + "/exe";
  return waitUntil([&] {
    std::error_code failed;
    return std::filesystem::read_symlink(link, failed) == program;
  });
}

void Peer::reap() {
  ::waitpid(pid_, nullptr, 0);
  pid_ = -1;
}

void Peer::kill() { ::kill(pid_, SIGKILL); }

std::function<bool(int)> executing(const std::string& program, std::vector<std::string> arguments) {
  return [program, arguments = std::move(arguments)](int) mutable {
    arguments.insert(arguments.begin(), program);
    std::vector<char*> pointers;
    for (std::string& argument : arguments) pointers.push_back(argument.data());
    pointers.push_back(nullptr);
    return ::execv(program.c_str(), pointers.data()) == 0;
  };
}

int runInChild(const std::function<int()>& body) {
  const pid_t child = checked(::fork(), "fork");
  if (child == 0) ::_exit(resultOf(body));
  int status = 0;
  checked(::waitpid(child, &status, 0), "waitpid");
  return WIFEXITED(status) ? WEXITSTATUS(status) : 100 + WTERMSIG(status);
}

bool enterUserNamespace(int otherKinds) {
  const std::string user = std::to_string(::geteuid());
  const std::string group = std::to_string(::getegid());
  return ::unshare(CLONE_NEWUSER | otherKinds) == 0 && writeTo("/proc/self/setgroups", "deny") &&
         writeTo("/proc/self/uid_map", "0 " + user + " 1") &&
         writeTo("/proc/self/gid_map", "0 " + group + " 1");
}

bool enterProcessNamespace(int otherKinds) {
  if (!enterUserNamespace(CLONE_NEWPID | otherKinds)) return false;
  const pid_t child = ::fork();
  if (child > 0) {
    int status = 0;
    ::waitpid(child, &status, 0);
    ::_exit(WIFEXITED(status) ? WEXITSTATUS(status) : 99);
  }
  return child == 0;
}

std::string makeProgram(const std::string& path) {
  std::filesystem::create_directories(std::filesystem::path(path).parent_path());
  std::filesystem::copy_file("/bin/sleep", path);
  return path;
}

}  // namespace brivo::test
