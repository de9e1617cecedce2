// SPDX-License-Identifier: MIT
#include "platform/zeph/signal_batch.h"

#include <sys/socket.h>

#include <cerrno>

#include "platform/zeph/bus_driver.h"
#include "platform/zeph/message_builder.h"
#include "platform/zeph/value_writer.h"

namespace brivo::zeph {

namespace {

/// The kernel takes this much whole or not at all, so that a message is hardly ever written in part.
constexpr std::size_t kFull = 24'576;

/// sd-bus counts its own messages on the connection from 1 on.
constexpr std::uint32_t kFirstSerial = 0x8000'0000;

constexpr std::uint8_t kSignalType = 4;
constexpr std::uint8_t kNoReplyExpected = 1;
constexpr std::uint8_t kProtocolVersion = 1;

enum class Field : std::uint8_t { path = 1, interface = 2, member = 3, sender = 7, signature = 8 };

void addField(MessageBuilder& message, Field field, const char* type, std::string_view value) {
  message.pad(8);
  message.u8(static_cast<std::uint8_t>(field));
  message.signature(type);
  if (*type == 'g') {
    message.signature(value);
  } else {
    message.text(value);
  }
}

}  // namespace

bool SignalBatch::append(const OutgoingSignal& signal, const char* interface, std::size_t weight) {
  constexpr std::size_t kBodyLengthAt = 4;
  constexpr std::size_t kFieldsLengthAt = 12;
  constexpr std::size_t kFieldsAt = 16;
  const std::size_t before = bytes_.size();
  MessageBuilder message(bytes_);
  message.u8('l');
  message.u8(kSignalType);
  message.u8(kNoReplyExpected);
  message.u8(kProtocolVersion);
  message.u32(0);
  message.u32(kFirstSerial | ++lastSerial_);
  message.u32(0);
  addField(message, Field::path, "o", kObjectPath);
  addField(message, Field::interface, "s", interface);
  addField(message, Field::member, "s", signal.member->dbusName());
  addField(message, Field::sender, "s", kServiceName);
  addField(message, Field::signature, "g", signal.member->in);
  message.patch(kFieldsLengthAt, static_cast<std::uint32_t>(message.size() - kFieldsAt));
  message.pad(8);
  const std::size_t header = message.size();
  if (Writer(message, false).appendAll(*signal.arguments, signal.member->in) < 0) {
    bytes_.resize(before);
    return false;
  }
  message.patch(kBodyLengthAt, static_cast<std::uint32_t>(message.size() - header));
  waiting_.push_back({bytes_.size(), weight});
  return true;
}

SignalBatch::Written SignalBatch::writeTo(int fd) {
  while (written_ < bytes_.size()) {
    const ssize_t count =
        ::send(fd, &bytes_[written_], bytes_.size() - written_, MSG_DONTWAIT | MSG_NOSIGNAL);
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) return errno == EAGAIN ? Written::some : Written::hungUp;
    written_ += static_cast<std::size_t>(count);
    while (!waiting_.empty() && waiting_.front().end <= written_) {
      boundary_ = waiting_.front().end;
      ++left_.messages;
      left_.weight += waiting_.front().weight;
      waiting_.pop_front();
    }
  }
  bytes_.clear();
  written_ = boundary_ = 0;
  return Written::all;
}

bool SignalBatch::isFull() const { return bytes_.size() - written_ >= kFull; }

bool SignalBatch::isInsideMessage() const { return written_ != boundary_; }

SignalBatch::Left SignalBatch::takeLeft() { return std::exchange(left_, Left()); }

}  // namespace brivo::zeph
