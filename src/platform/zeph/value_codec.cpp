// SPDX-License-Identifier: MIT
#include "platform/zeph/value_codec.h"

#include <fcntl.h>
#include <systemd/sd-bus.h>

#include <span>

#include "platform/zeph/value_writer.h"

namespace brivo::zeph {

namespace {

constexpr int kDeepest = 32;
constexpr std::size_t kMostValues = 100'000;
constexpr std::size_t kMostEntries = 1024;  // of one dictionary; its lookups are linear

/// Appends to a message of sd-bus.
class BusSink {
 public:
  explicit BusSink(sd_bus_message* message) : message_(message) {}
  int appendBasic(char type, const void* value) { return sd_bus_message_append_basic(message_, type, value); }
  int appendBytes(std::span<const std::byte> bytes) {
    return sd_bus_message_append_array(message_, 'y', bytes.data(), bytes.size());
  }
  int open(char type, const char* contents) {
    return sd_bus_message_open_container(message_, type, contents);
  }
  int close() { return sd_bus_message_close_container(message_); }

 private:
  sd_bus_message* message_;
};

// --------------------------------------------------------------------------------------------------- reading

class Reader {
 public:
  Reader(sd_bus_message* message, Descriptors descriptors) : message_(message), descriptors_(descriptors) {}

  std::optional<Arguments> all() {
    Arguments values;
    while (sd_bus_message_at_end(message_, 0) == 0) {
      auto value = next(0);
      if (!value) return std::nullopt;
      values.push_back(std::move(*value));
    }
    return values;
  }

 private:
  std::optional<Value> next(int depth) {
    char type = 0;
    const char* contents = nullptr;
    if (depth > kDeepest || ++count_ > kMostValues ||
        sd_bus_message_peek_type(message_, &type, &contents) <= 0) {
      return std::nullopt;
    }
    switch (type) {
      case 'b': {
        const auto value = basic<int>('b');
        return value ? std::optional<Value>(*value != 0) : std::nullopt;
      }
      case 'y':
        return widened<std::uint8_t, std::uint32_t>('y');
      case 'q':
        return widened<std::uint16_t, std::uint32_t>('q');
      case 'n':
        return widened<std::int16_t, std::int32_t>('n');
      case 'i':
        return widened<std::int32_t, std::int32_t>('i');
      case 'u':
        return widened<std::uint32_t, std::uint32_t>('u');
      case 'x':
        return widened<std::int64_t, std::int64_t>('x');
      case 't':
        return widened<std::uint64_t, std::uint64_t>('t');
      case 'd':
        return widened<double, double>('d');
      case 's': {
        const auto value = basic<const char*>('s');
        return value ? std::optional<Value>(*value) : std::nullopt;
      }
      case 'v':
        return inside('v', contents, [&] { return next(depth + 1); });
      case 'a':
        return array(contents, depth);
      case 'r':
        return std::strcmp(contents, "ht") == 0 ? descriptorAndSize() : std::nullopt;
      default:  // object paths, signatures, lone descriptors, other structures
        return std::nullopt;
    }
  }

  template <class T>
  std::optional<T> basic(char type) {
    T value{};
    if (sd_bus_message_read_basic(message_, type, &value) <= 0) return std::nullopt;
    return value;
  }

  template <class Wire, class Held>
  std::optional<Value> widened(char type) {
    const auto value = basic<Wire>(type);
    return value ? std::optional<Value>(static_cast<Held>(*value)) : std::nullopt;
  }

  template <class Read>
  std::optional<Value> inside(char type, const char* contents, Read read) {
    if (sd_bus_message_enter_container(message_, type, contents) <= 0) return std::nullopt;
    auto value = read();
    if (!value || sd_bus_message_exit_container(message_) < 0) return std::nullopt;
    return value;
  }

  std::optional<Value> array(const char* contents, int depth) {
    const std::string_view element = contents;
    if (element == "y") {
      const void* bytes = nullptr;
      std::size_t size = 0;
      if (sd_bus_message_read_array(message_, 'y', &bytes, &size) < 0) return std::nullopt;
      return Value(Data::copyOf(std::span(static_cast<const std::byte*>(bytes), size)));
    }
    if (element == "{sv}") return inside('a', contents, [&] { return dictionary(depth); });
    if (element.starts_with('{')) return std::nullopt;
    const auto kind = element == "s"    ? Array::Kind::strings
                      : element == "ay" ? Array::Kind::data
                                        : Array::Kind::any;
    return inside('a', contents, [&]() -> std::optional<Value> {
      Array values(kind);
      while (sd_bus_message_at_end(message_, 0) == 0) {
        auto value = next(depth + 1);
        if (!value) return std::nullopt;
        values.append(std::move(*value));
      }
      return Value(std::move(values));
    });
  }

  std::optional<Value> dictionary(int depth) {
    Dictionary dictionary;
    while (sd_bus_message_at_end(message_, 0) == 0) {
      const auto entry = inside('e', "sv", [&]() -> std::optional<Value> {
        const auto key = basic<const char*>('s');
        if (!key) return std::nullopt;
        const std::string held = *key;
        auto value = next(depth + 1);
        if (value) dictionary.set(held, std::move(*value));
        return value ? std::optional<Value>(true) : std::nullopt;
      });
      if (!entry || dictionary.size() > kMostEntries) return std::nullopt;
    }
    return Value(std::move(dictionary));
  }

  std::optional<Value> descriptorAndSize() {
    if (descriptors_ == Descriptors::refused) return std::nullopt;
    return inside('r', "ht", [&]() -> std::optional<Value> {
      const auto fd = basic<int>('h');  // borrowed from the message
      const auto size = basic<std::uint64_t>('t');
      if (!fd || !size) return std::nullopt;
      UniqueFd own(::fcntl(*fd, F_DUPFD_CLOEXEC, 0));
      if (!own) return std::nullopt;
      if (descriptors_ == Descriptors::asBuffers) return Value(SharedBuffer(std::move(own), *size));
      auto data = dataFromSealedMemfd(std::move(own), *size);
      return data ? std::optional<Value>(std::move(*data)) : std::nullopt;
    });
  }

  sd_bus_message* message_;
  Descriptors descriptors_;
  std::size_t count_ = 0;
};

std::size_t weightOf(const Value& value) {
  constexpr std::size_t kPerValue = sizeof(Value);
  if (const auto* text = value.get<std::string>()) return kPerValue + text->size();
  if (const auto* data = value.get<Data>()) return kPerValue + data->size();
  if (const auto* array = value.get<Array>()) {
    std::size_t sum = kPerValue;
    for (const Value& element : *array) sum += weightOf(element);
    return sum;
  }
  if (const auto* dictionary = value.get<Dictionary>()) {
    std::size_t sum = kPerValue;
    for (const auto& [key, entry] : *dictionary) sum += sizeof(std::string) + key.size() + weightOf(entry);
    return sum;
  }
  return kPerValue;
}

}  // namespace

int appendArguments(sd_bus_message* message, const char* signature, std::span<const Value> values,
                    bool descriptors) {
  BusSink sink(message);
  return Writer(sink, descriptors).appendAll(values, signature);
}

std::optional<Arguments> readArguments(sd_bus_message* message, Descriptors descriptors) {
  return Reader(message, descriptors).all();
}

std::size_t weight(std::span<const Value> values) {
  std::size_t sum = 0;
  for (const Value& value : values) sum += weightOf(value);
  return sum;
}

}  // namespace brivo::zeph
