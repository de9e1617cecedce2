// SPDX-License-Identifier: MIT
#include "child_process.h"

#include <signal.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <stdexcept>

namespace brivo::bench {

namespace {

/// The end of the child, without the destructors of what it shares with its parent.
[[noreturn]] void runAndEnd(const std::function<void(int socket)>& work, int socket) {
  try {
    work(socket);
  } catch (const std::exception& error) {
    std::fprintf(stderr, "child process: %s\n", error.what());
    ::_exit(1);
  }
  ::_exit(0);
}

}  // namespace

ChildProcess::ChildProcess(const std::function<void(int socket)>& work) {
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
  runAndEnd(work, other.get());
}

ChildProcess::~ChildProcess() {
  ::kill(pid_, SIGTERM);
  ::waitpid(pid_, nullptr, 0);
}

}  // namespace brivo::bench
