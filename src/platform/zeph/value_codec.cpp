// SPDX-License-Identifier: MIT
#include "platform/zeph/value_codec.h"

#include <fcntl.h>
#include <systemd/sd-bus.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "platform/base/memory_file.h"
#include "platform/text/unicode.h"

namespace brivo::zeph {

namespace {

constexpr int kDeepest = 32;
constexpr std::size_t kMostValues = 100'000;
constexpr std::size_t kMostEntries = 1024;  // of one dictionary; its lookups are linear

/// Text that D-Bus takes: UTF-8 without NUL characters.
std::string wireText(const std::string& text) {
  if (isUtf8(text) && text.find('\0') == std::string::npos) return text;
  std::string safe = replacingInvalidUtf8(text);
  std::erase(safe, '\0');
  return safe;
}

Dictionary dictionaryOf(const Error& error) {
  return {{"domain", error.domain}, {"code", error.code}, {"text", error.text}};
}

bool isLarge(const Data& data) { return data.size() >= kDescriptorThreshold; }

// --------------------------------------------------------------------------------------------------- writing

class Writer {
 public:
  Writer(sd_bus_message* message, bool descriptors) : message_(message), descriptors_(descriptors) {}

  /// Appends `value` as `type`, one complete type of a member's signature.
  int append(const Value& value, std::string_view type) const {
    if (type == "v") return variant(value);
    if (type == "a{sv}") {
      const auto* held = value.get<Dictionary>();
      return held ? dictionary(*held) : -EINVAL;
    }
    if (type == "as") {
      const auto* held = value.get<Array>();
      return held ? strings(*held) : -EINVAL;
    }
    if (type == "s") {
      const auto* held = value.get<std::string>();
      return held ? text(*held) : -EINVAL;
    }
    return number(value, type.front());
  }

 private:
  int number(const Value& value, char type) const {
    const auto integer = value.asUnsigned();
    if (!integer) return -EINVAL;
    switch (type) {
      case 't':
        return basic('t', *integer);
      case 'u':
        return basic('u', static_cast<std::uint32_t>(*integer));
      default:
        return -EINVAL;
    }
  }

  template <class T>
  int basic(char type, T value) const {
    return sd_bus_message_append_basic(message_, type, &value);
  }

  int text(const std::string& value) const {
    return sd_bus_message_append_basic(message_, 's', wireText(value).c_str());
  }

  /// Opens a container, runs `fill` and closes it.
  template <class Fill>
  int container(char type, const char* contents, Fill fill) const {
    int result = sd_bus_message_open_container(message_, type, contents);
    if (result >= 0) result = fill();
    return result < 0 ? result : sd_bus_message_close_container(message_);
  }

  template <class Range, class Append>
  static int each(const Range& range, Append appendOne) {
    for (const auto& element : range) {
      if (const int result = appendOne(element); result < 0) return result;
    }
    return 0;
  }

  int dictionary(const Dictionary& value) const {
    return container('a', "{sv}", [&] {
      return each(value, [&](const Dictionary::Entry& entry) {
        if (entry.second.valueClass() == Value::Class::none) return 0;
        return container('e', "sv", [&] {
          const int result = text(entry.first);
          return result < 0 ? result : variant(entry.second);
        });
      });
    });
  }

  int strings(const Array& value) const {
    return container('a', "s", [&] {
      return each(value, [&](const Value& element) {
        const auto* string = element.get<std::string>();
        return string ? text(*string) : -EINVAL;
      });
    });
  }

  int bytes(const Data& value) const {
    return sd_bus_message_append_array(message_, 'y', value.bytes().data(), value.size());
  }

  int variant(const Value& value) const {
    return value.visit([&](const auto& held) { return variantOf(held); });
  }

  template <class T>
  int simple(const char* type, T value) const {
    return container('v', type, [&] { return basic(*type, value); });
  }
  int variantOf(std::monostate) const { return -EINVAL; }
  int variantOf(bool value) const { return simple<int>("b", value ? 1 : 0); }
  int variantOf(std::int32_t value) const { return simple("i", value); }
  int variantOf(std::uint32_t value) const { return simple("u", value); }
  int variantOf(std::int64_t value) const { return simple("x", value); }
  int variantOf(std::uint64_t value) const { return simple("t", value); }
  int variantOf(double value) const { return simple("d", value); }
  int variantOf(const std::string& value) const {
    return container('v', "s", [&] { return text(value); });
  }
  int variantOf(const Url& value) const { return variantOf(value.text()); }
  int variantOf(const Endpoint& value) const { return variantOf(value.address); }
  int variantOf(const Error& value) const { return variantOf(dictionaryOf(value)); }
  int variantOf(const Dictionary& value) const {
    return container('v', "a{sv}", [&] { return dictionary(value); });
  }
  int variantOf(const IndexSet& value) const {
    return container('v', "at", [&] {
      return container('a', "t", [&] {
        return each(value.indexes, [&](std::uint64_t index) { return basic('t', index); });
      });
    });
  }
  int variantOf(const Data& value) const {
    if (descriptors_ && isLarge(value)) return descriptorOf(value);
    return container('v', "ay", [&] { return bytes(value); });
  }
  int variantOf(const SharedBuffer& value) const { return descriptorAndSize(value.fd(), value.size()); }
  int variantOf(const Array& value) const {
    switch (kindOf(value)) {
      case Array::Kind::strings:
        return container('v', "as", [&] { return strings(value); });
      case Array::Kind::data:
        return container('v', "aay", [&] {
          return container('a', "ay", [&] {
            return each(value, [&](const Value& element) { return bytes(*element.get<Data>()); });
          });
        });
      case Array::Kind::any:
        break;
    }
    return container('v', "av", [&] {
      return container('a', "v", [&] {
        return each(value, [&](const Value& element) {
          return element.valueClass() == Value::Class::none ? 0 : variant(element);
        });
      });
    });
  }

  /// (ht): the memory file that holds the bytes, a new one when they lie elsewhere.
  int descriptorOf(const Data& value) const {
    Data held = value;
    if (held.memfd() < 0) {
      auto file = MemoryFile::create("brivod-data", held.size());
      if (!file) return -errno;
      std::memcpy(file->bytes().data(), held.bytes().data(), held.size());
      auto sealed = std::move(*file).seal(held.size());
      if (!sealed) return -errno;
      held = std::move(*sealed);
    }
    return descriptorAndSize(held.memfd(), held.size());
  }

  int descriptorAndSize(int fd, std::uint64_t size) const {
    return container('v', "(ht)", [&] {
      return container('r', "ht", [&] {
        const int result = basic('h', fd);
        return result < 0 ? result : basic('t', size);
      });
    });
  }

  Array::Kind kindOf(const Array& array) const {
    if (array.empty()) return array.kind();
    const auto all = [&](auto test) { return std::ranges::all_of(array, test); };
    if (all([](const Value& element) { return element.get<std::string>() != nullptr; })) {
      return Array::Kind::strings;
    }
    const auto isSmallData = [](const Value& element) {
      const auto* data = element.get<Data>();
      return data && !isLarge(*data);
    };
    return all(isSmallData) ? Array::Kind::data : Array::Kind::any;
  }

  sd_bus_message* message_;
  bool descriptors_;
};

/// Splits a member's signature, which holds only the types that Writer::append() knows.
std::string_view firstType(std::string_view signature) {
  if (signature.starts_with("a{sv}")) return signature.substr(0, 5);
  return signature.substr(0, signature.front() == 'a' ? 2 : 1);
}

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
  const Writer writer(message, descriptors);
  std::string_view rest = signature;
  for (const Value& value : values) {
    if (rest.empty()) return -EINVAL;
    const std::string_view type = firstType(rest);
    if (const int result = writer.append(value, type); result < 0) return result;
    rest.remove_prefix(type.size());
  }
  return rest.empty() ? 0 : -EINVAL;
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
