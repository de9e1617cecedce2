// SPDX-License-Identifier: MIT
#include "wire_client.h"

#include <poll.h>
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cstring>
#include <stdexcept>

#include "figures.h"
#include "support/raw_dbus.h"

namespace brivo::bench {

namespace {

// The fixed part of a message (D-Bus Specification, "Message Format").
constexpr std::size_t kFixedHeader = 16;
constexpr std::size_t kTypeAt = 1;
constexpr std::size_t kBodyLengthAt = 4;
constexpr std::size_t kSerialAt = 8;
constexpr std::size_t kFieldsLengthAt = 12;
constexpr char kSignal = 4;

constexpr std::string_view kEndOfAuthentication = "AGREE_UNIX_FD\r\n";
constexpr int kQuietMilliseconds = 300;

std::uint32_t numberAt(std::string_view bytes, std::size_t place) {
  std::uint32_t number = 0;
  std::memcpy(&number, bytes.substr(place, sizeof number).data(), sizeof number);
  return number;
}

constexpr std::size_t aligned(std::size_t size, std::size_t boundary) {
  return (size + boundary - 1) / boundary * boundary;
}

std::size_t lengthOf(std::string_view message) {
  return kFixedHeader + aligned(numberAt(message, kFieldsLengthAt), 8) + numberAt(message, kBodyLengthAt);
}

}  // namespace

WireClient WireClient::authenticated(const std::string& path) {
  WireClient client(test::connectRaw(path));
  client.send(test::authentication());
  while (!client.received_.ends_with(kEndOfAuthentication)) client.receiveMore();
  client.received_.clear();
  return client;
}

std::string WireClient::call(std::string_view interface, std::string_view member, std::string_view signature,
                             std::string_view body) {
  post(interface, member, signature, body);
  while (true) {
    const std::string_view message = receive();
    if (message[kTypeAt] != kSignal) return std::string(message);
  }
}

void WireClient::post(std::string_view interface, std::string_view member, std::string_view signature,
                      std::string_view body) {
  send(test::methodCall(++lastSerial_, interface, member, signature, body));
}

void WireClient::receiveUntil(std::string_view text, std::size_t times) {
  std::size_t seen = 0;
  while (seen < times) {
    const std::string_view message = receive();
    for (std::size_t at = message.find(text); at != std::string_view::npos; at = message.find(text, at + 1))
      ++seen;
  }
}

void WireClient::dropSignals() {
  pollfd waiting{socket_.get(), POLLIN, 0};
  while (::poll(&waiting, 1, kQuietMilliseconds) > 0) receiveMore();
  received_.clear();
  used_ = 0;
}

double WireClient::roundTrips(std::string request, std::size_t count, std::size_t outstanding) {
  const auto sendNext = [&] {
    ++lastSerial_;
    std::memcpy(request.data() + kSerialAt, &lastSerial_, sizeof lastSerial_);
    send(request);
  };
  const Stopwatch watch;
  for (std::size_t i = 0; i < std::min(count, outstanding); ++i) sendNext();
  for (std::size_t answers = 1; answers <= count; ++answers) {
    receive();
    if (answers + outstanding <= count) sendNext();
  }
  return watch.milliseconds() / static_cast<double>(count);
}

void WireClient::send(std::string_view bytes) const { test::sendAll(socket_.get(), bytes); }

std::string_view WireClient::receive() {
  const auto waiting = [this] { return std::string_view(received_).substr(used_); };
  while (waiting().size() < kFixedHeader || waiting().size() < lengthOf(waiting())) receiveMore();
  const std::string_view message = waiting().substr(0, lengthOf(waiting()));
  used_ += message.size();
  return message;
}

void WireClient::receiveMore() {
  received_.erase(0, used_);
  used_ = 0;
  std::array<char, 65'536> buffer;
  const ssize_t count = ::recv(socket_.get(), buffer.data(), buffer.size(), 0);
  if (count <= 0) throw std::runtime_error("the peer hung up");
  received_.append(buffer.data(), static_cast<std::size_t>(count));
}

std::string textUnder(std::string_view key, std::string_view message) {
  const std::size_t found = message.find(key);
  if (found == std::string_view::npos) throw std::runtime_error("no " + std::string(key) + " in the answer");
  constexpr std::size_t kSignatureOfText = 3;  // its length, "s" and the zero at its end
  const std::size_t length = aligned(found + key.size() + 1 + kSignatureOfText, sizeof(std::uint32_t));
  return std::string(message.substr(length + sizeof(std::uint32_t), numberAt(message, length)));
}

}  // namespace brivo::bench
