// SPDX-License-Identifier: MIT
#include "support/raw_dbus.h"

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <cstddef>
#include <cstdio>
#include <cstring>
#include <stdexcept>
#include <vector>

namespace brivo::test {

namespace {

/// None, with errno, when nobody is there.
UniqueFd tryToConnect(const std::string& path) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, path.c_str(), sizeof address.sun_path - 1);
  UniqueFd fd(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  if (::connect(fd.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) return {};
  return fd;
}

}  // namespace

bool isListening(const std::string& path) { return static_cast<bool>(tryToConnect(path)); }

UniqueFd connectRaw(const std::string& path) {
  UniqueFd fd = tryToConnect(path);
  if (!fd) throw std::runtime_error("connect to " + path + ": " + std::strerror(errno));
  const timeval limit{10, 0};
  ::setsockopt(fd.get(), SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
  return fd;
}

std::string authentication() {
  std::string hex;
  for (const char digit : std::to_string(::getuid())) {
    char buffer[3];
    std::snprintf(buffer, sizeof buffer, "%02x", static_cast<unsigned>(digit));
    hex += buffer;
  }
  return std::string(1, '\0') + "AUTH EXTERNAL " + hex + "\r\nNEGOTIATE_UNIX_FD\r\nBEGIN\r\n";
}

namespace {

void align(std::string& bytes, std::size_t boundary) {
  while (bytes.size() % boundary != 0) bytes += '\0';
}

void append32(std::string& bytes, std::uint32_t value) {
  for (int shift = 0; shift < 32; shift += 8) bytes += static_cast<char>(value >> shift & 0xFF);
}

void appendText(std::string& bytes, std::string_view text) {
  align(bytes, 4);
  append32(bytes, static_cast<std::uint32_t>(text.size()));
  bytes += text;
  bytes += '\0';
}

/// A header field: its code and a variant of one string-like type.
void appendField(std::string& bytes, char code, char type, std::string_view text) {
  align(bytes, 8);
  bytes += {code, 1, type, 0};
  if (type == 'g') {
    bytes += static_cast<char>(text.size());
    bytes += text;
    bytes += '\0';
  } else {
    appendText(bytes, text);
  }
}

/// A header field: its code and a variant of an unsigned number.
void appendNumberField(std::string& bytes, char code, std::uint32_t number) {
  align(bytes, 8);
  bytes += {code, 1, 'u', 0};
  append32(bytes, number);
}

}  // namespace

std::string marshalledString(std::string_view text) {
  std::string bytes;
  appendText(bytes, text);
  return bytes;
}

std::string methodCall(std::uint32_t serial, std::string_view interface, std::string_view member,
                       std::string_view signature, std::string_view body, std::uint32_t descriptors,
                       std::string_view destination) {
  std::string fields(16, '\0');  // stands for what comes before, so that alignment comes out right
  appendField(fields, 1, 'o', "/org/orvid/brivod");
  appendField(fields, 2, 's', interface);
  appendField(fields, 3, 's', member);
  if (!destination.empty()) appendField(fields, 6, 's', destination);
  if (!signature.empty()) appendField(fields, 8, 'g', signature);
  if (descriptors > 0) appendNumberField(fields, 9, descriptors);
  fields.erase(0, 16);
  std::string message = {'l', 1, 0, 1};  // little-endian, method call, no flags, version 1
  append32(message, static_cast<std::uint32_t>(body.size()));
  append32(message, serial);
  append32(message, static_cast<std::uint32_t>(fields.size()));
  message += fields;
  align(message, 8);
  message += body;
  return message;
}

void sendAll(int fd, std::string_view bytes) {
  while (!bytes.empty()) {
    const ssize_t sent = ::send(fd, bytes.data(), bytes.size(), MSG_NOSIGNAL);
    if (sent <= 0) return;  // the peer hung up; hangsUp() tells
    bytes.remove_prefix(static_cast<std::size_t>(sent));
  }
}

bool sendWithDescriptors(int fd, std::string bytes, std::size_t count) {
  const std::vector<int> passed(count, STDOUT_FILENO);
  const std::size_t size = count * sizeof(int);
  std::vector<std::max_align_t> control(CMSG_SPACE(size) / sizeof(std::max_align_t) + 1);
  iovec data{bytes.data(), bytes.size()};
  msghdr header{};
  header.msg_iov = &data;
  header.msg_iovlen = 1;
  header.msg_control = control.data();
  header.msg_controllen = CMSG_SPACE(size);
  cmsghdr* entry = CMSG_FIRSTHDR(&header);
  entry->cmsg_level = SOL_SOCKET;
  entry->cmsg_type = SCM_RIGHTS;
  entry->cmsg_len = CMSG_LEN(size);
  std::memcpy(CMSG_DATA(entry), passed.data(), size);
  return ::sendmsg(fd, &header, MSG_NOSIGNAL) == static_cast<ssize_t>(bytes.size());
}

std::string receive(int fd, std::size_t size) {
  std::string bytes;
  char buffer[4096];
  while (bytes.size() < size) {
    const ssize_t count = ::recv(fd, buffer, std::min(sizeof buffer, size - bytes.size()), 0);
    if (count <= 0) break;
    bytes.append(buffer, static_cast<std::size_t>(count));
  }
  return bytes;
}

bool hangsUp(int fd) {
  char buffer[4096];
  ssize_t count = 0;
  while ((count = ::recv(fd, buffer, sizeof buffer, 0)) > 0) {
  }
  return count == 0 || errno == ECONNRESET;
}

std::size_t openDescriptorCount() {
  constexpr int kBeyondAnyTest = 20'000;
  std::size_t count = 0;
  for (int fd = 0; fd < kBeyondAnyTest; ++fd) count += ::fcntl(fd, F_GETFD) >= 0 ? 1 : 0;
  return count;
}

}  // namespace brivo::test
