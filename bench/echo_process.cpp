// SPDX-License-Identifier: MIT
#include "echo_process.h"

#include <sys/socket.h>

#include <array>

namespace brivo::bench {

namespace {

void answerRequests(int socket, std::size_t requestSize, const std::string& answer) {
  static std::array<char, 65'536> buffer;
  std::size_t waiting = 0;
  while (true) {
    const ssize_t count = ::recv(socket, buffer.data(), buffer.size(), 0);
    if (count <= 0) return;
    waiting += static_cast<std::size_t>(count);
    for (; waiting >= requestSize; waiting -= requestSize) {
      if (::send(socket, answer.data(), answer.size(), MSG_NOSIGNAL) < 0) return;
    }
  }
}

}  // namespace

EchoProcess::EchoProcess(std::size_t requestSize, const std::string& answer)
    : process_([&](int socket) { answerRequests(socket, requestSize, answer); }) {}

}  // namespace brivo::bench
