// SPDX-License-Identifier: MIT
#include "echo_process.h"

#include <signal.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <stdexcept>

namespace brivo::bench {

namespace {

[[noreturn]] void answerRequests(int fd, std::size_t requestSize, const std::string& answer) {
  static std::array<char, 65'536> buffer;
  std::size_t waiting = 0;
  while (true) {
    const ssize_t count = ::recv(fd, buffer.data(), buffer.size(), 0);
    if (count <= 0) ::_exit(0);
    waiting += static_cast<std::size_t>(count);
    for (; waiting >= requestSize; waiting -= requestSize) {
      if (::send(fd, answer.data(), answer.size(), MSG_NOSIGNAL) < 0) ::_exit(0);
    }
  }
}

}  // namespace

EchoProcess::EchoProcess(std::size_t requestSize, const std::string& answer) {
  std::array<int, 2> ends{};
  if (::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends.data()) != 0) {
    throw std::runtime_error("no socket pair");
  }
  socket_ = UniqueFd(ends[0]);
  const UniqueFd other(ends[1]);
  pid_ = ::fork();
  if (pid_ < 0) throw std::runtime_error("cannot fork");
  if (pid_ > 0) return;
  ::prctl(PR_SET_PDEATHSIG, SIGTERM);
  socket_.reset();
  answerRequests(other.get(), requestSize, answer);
}

EchoProcess::~EchoProcess() {
  ::kill(pid_, SIGTERM);
  ::waitpid(pid_, nullptr, 0);
}

}  // namespace brivo::bench
