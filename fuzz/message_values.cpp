// SPDX-License-Identifier: MIT
#include <fuzzer/FuzzedDataProvider.h>
#include <systemd/sd-bus.h>

#include <memory>
#include <string>

#include "check.h"
#include "platform/zeph/value_codec.h"

namespace {

constexpr int kDeepest = 40;  // beyond what the reader takes

/// Appends what the input says, as any client could, to a message that no one will send.
class Writer {
 public:
  Writer(sd_bus_message* message, FuzzedDataProvider& input) : message_(message), input_(input) {}

  void appendAny(int depth) {
    switch (input_.ConsumeIntegralInRange(0, depth < kDeepest ? 9 : 5)) {
      case 0:
        return number<std::uint8_t>('y');
      case 1:
        return number<std::int32_t>('i');
      case 2:
        return number<std::uint64_t>('t');
      case 3:
        return number<double>('d');
      case 4:
        return text();
      case 5:
        return bytes();
      case 6:
        return inside('v', "s", [&] { text(); });
      case 7:
        return inside('v', "a{sv}", [&] { dictionary(depth + 1); });
      case 8:
        return inside('v', "av", [&] { array(depth + 1); });
      default:
        return dictionary(depth + 1);
    }
  }

 private:
  template <class Number>
  void number(char type) {
    const auto value = static_cast<Number>(input_.ConsumeIntegral<std::uint64_t>());
    sd_bus_message_append_basic(message_, type, &value);
  }

  void text() { sd_bus_message_append_basic(message_, 's', utf8().c_str()); }

  std::string utf8() {
    std::string text = input_.ConsumeRandomLengthString(20);
    for (char& c : text) c = static_cast<char>((c & 0x5f) | 0x20);
    return text;
  }

  void bytes() {
    const auto data = input_.ConsumeBytes<std::uint8_t>(input_.ConsumeIntegralInRange<std::size_t>(0, 64));
    sd_bus_message_append_array(message_, 'y', data.data(), data.size());
  }

  template <class Body>
  void inside(char type, const char* contents, const Body& body) {
    if (sd_bus_message_open_container(message_, type, contents) < 0) return;
    body();
    sd_bus_message_close_container(message_);
  }

  void variant(int depth) {
    if (input_.ConsumeBool()) return inside('v', "i", [&] { number<std::int32_t>('i'); });
    if (input_.ConsumeBool()) return inside('v', "ay", [&] { bytes(); });
    if (depth >= kDeepest) return inside('v', "s", [&] { text(); });
    if (input_.ConsumeBool()) return inside('v', "a{sv}", [&] { dictionary(depth + 1); });
    if (input_.ConsumeBool()) return inside('v', "v", [&] { variant(depth + 1); });
    inside('v', "av", [&] { array(depth + 1); });
  }

  void array(int depth) {
    inside('a', "v", [&] {
      while (input_.remaining_bytes() > 0 && input_.ConsumeBool()) variant(depth);
    });
  }

  void dictionary(int depth) {
    inside('a', "{sv}", [&] {
      while (input_.remaining_bytes() > 0 && input_.ConsumeBool()) {
        inside('e', "sv", [&] {
          text();
          variant(depth);
        });
      }
    });
  }

  sd_bus_message* message_;
  FuzzedDataProvider& input_;
};

using Bus = std::unique_ptr<sd_bus, decltype(&sd_bus_unref)>;
using Message = std::unique_ptr<sd_bus_message, decltype(&sd_bus_message_unref)>;

/// A bus that never connects; messages can be made on it.
Bus makeBus() {
  sd_bus* bus = nullptr;
  check(sd_bus_new(&bus) >= 0 && sd_bus_set_address(bus, "unix:path=/nowhere") >= 0);
  (void)sd_bus_start(bus);
  return {bus, &sd_bus_unref};
}

}  // namespace

// No arguments that a client can send hurt the reader; what it reads can be sent back.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const Bus bus = makeBus();
  FuzzedDataProvider input(data, size);
  sd_bus_message* made = nullptr;
  if (sd_bus_message_new(bus.get(), &made, SD_BUS_MESSAGE_METHOD_CALL) < 0) return 0;
  const Message message(made, &sd_bus_message_unref);
  Writer writer(made, input);
  while (input.remaining_bytes() > 0) writer.appendAny(0);
  if (sd_bus_message_seal(made, 1, 0) < 0 || sd_bus_message_rewind(made, 1) < 0) return 0;
  const auto values = brivo::zeph::readArguments(made, brivo::zeph::Descriptors::refused);
  if (!values) return 0;
  for (const brivo::Value& value : *values) {
    if (!value.get<brivo::Dictionary>()) continue;
    sd_bus_message* answer = nullptr;
    check(sd_bus_message_new(bus.get(), &answer, SD_BUS_MESSAGE_METHOD_CALL) >= 0);
    const Message owner(answer, &sd_bus_message_unref);
    check(brivo::zeph::appendArguments(answer, "a{sv}", std::span(&value, 1), false) >= 0);
  }
  return 0;
}
