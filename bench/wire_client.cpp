// SPDX-License-Identifier: MIT
#include "wire_client.h"

#include <poll.h>

#include <algorithm>
#include <array>
#include <cstring>
#include <stdexcept>

#include "descriptor_message.h"
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

template <class Number>
Number loaded(std::string_view bytes, std::size_t place) {
  Number number = 0;
  const std::string_view here = bytes.substr(place, sizeof number);
  std::memcpy(&number, here.data(), here.size());
  return number;
}
std::uint32_t numberAt(std::string_view bytes, std::size_t place) {
  return loaded<std::uint32_t>(bytes, place);
}
std::uint64_t longNumberAt(std::string_view bytes, std::size_t place) {
  return loaded<std::uint64_t>(bytes, place);
}

constexpr std::size_t aligned(std::size_t size, std::size_t boundary) {
  return (size + boundary - 1) / boundary * boundary;
}

std::size_t lengthOf(std::string_view message) {
  return kFixedHeader + aligned(numberAt(message, kFieldsLengthAt), 8) + numberAt(message, kBodyLengthAt);
}

/// Where the type of the value under `key` lies, behind its length; the first at or behind `from`. Throws
/// when the key is not there.
std::size_t placeOfType(std::string_view key, std::string_view message, std::size_t from = 0) {
  const std::string entry = test::marshalledString(key);
  const std::size_t found = message.find(entry, from);
  if (found == std::string_view::npos) throw std::runtime_error("no " + std::string(key) + " in the answer");
  return found + entry.size() + sizeof(std::uint8_t);
}

/// Where the value itself lies; throws also when it is not of the type `signature`.
std::size_t placeOfValue(std::string_view key, std::string_view signature, std::size_t alignment,
                         std::string_view message, std::size_t from = 0) {
  const std::size_t type = placeOfType(key, message, from);
  if (message.substr(type, signature.size()) != signature) {
    throw std::runtime_error(std::string(key) + " in the answer is not " + std::string(signature));
  }
  return aligned(type + signature.size() + sizeof '\0', alignment);
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
  return std::string(receiveAnswer());
}

void WireClient::post(std::string_view interface, std::string_view member, std::string_view signature,
                      std::string_view body) {
  send(test::methodCall(++lastSerial_, interface, member, signature, body));
}

void WireClient::post(std::string_view interface, std::string_view member, std::string_view signature,
                      std::string_view body, int descriptor) {
  sendWithDescriptor(socket_.get(), test::methodCall(++lastSerial_, interface, member, signature, body, 1),
                     descriptor);
}

std::string_view WireClient::receiveAnswer() {
  while (true) {
    const std::string_view message = receive();
    if (message[kTypeAt] != kSignal) return message;
  }
}

UniqueFd WireClient::takeDescriptor() {
  if (descriptors_.empty()) throw std::runtime_error("no descriptor came with the answer");
  UniqueFd first = std::move(descriptors_.front());
  descriptors_.pop_front();
  return first;
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
  const std::ptrdiff_t count = receiveWithDescriptors(socket_.get(), buffer, descriptors_);
  if (count <= 0) throw std::runtime_error("the peer hung up");
  received_.append(buffer.data(), static_cast<std::size_t>(count));
}

std::string textUnder(std::string_view key, std::string_view message, std::size_t from) {
  const std::size_t place = placeOfValue(key, "s", sizeof(std::uint32_t), message, from);
  return std::string(message.substr(place + sizeof(std::uint32_t), numberAt(message, place)));
}

std::uint64_t numberUnder(std::string_view key, std::string_view message) {
  return longNumberAt(message, placeOfValue(key, "t", sizeof(std::uint64_t), message));
}

std::string_view bytesUnder(std::string_view key, std::string_view message) {
  const std::size_t place = placeOfValue(key, "ay", sizeof(std::uint32_t), message);
  return message.substr(place + sizeof(std::uint32_t), numberAt(message, place));
}

bool isMemoryUnder(std::string_view key, std::string_view message) {
  return message.substr(placeOfType(key, message)).starts_with("(ht)");
}

std::uint64_t memorySizeUnder(std::string_view key, std::string_view message) {
  // Behind the index of the descriptor, padded.
  return longNumberAt(message,
                      placeOfValue(key, "(ht)", sizeof(std::uint64_t), message) + sizeof(std::uint64_t));
}

}  // namespace brivo::bench
