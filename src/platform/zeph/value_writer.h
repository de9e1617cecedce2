// SPDX-License-Identifier: MIT
// Values as D-Bus types, for whatever builds the message.
#pragma once

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <span>
#include <string>
#include <string_view>

#include "platform/base/memory_file.h"
#include "platform/base/value.h"
#include "platform/text/unicode.h"
#include "platform/zeph/value_codec.h"

namespace brivo::zeph {

/// Text that every D-Bus library takes: UTF-8 without NUL characters and noncharacters.
inline std::string wireText(const std::string& text) {
  std::string safe = replacingNoncharacters(text);
  std::erase(safe, '\0');
  return safe;
}

inline Dictionary dictionaryOf(const Error& error) {
  return {{"domain", error.domain}, {"code", error.code}, {"text", error.text}};
}

inline bool isLarge(const Data& data) { return data.size() >= kDescriptorThreshold; }

/// Splits a member's signature, which holds only the types that Writer knows.
inline std::string_view firstType(std::string_view signature) {
  if (signature.starts_with("a{sv}")) return signature.substr(0, 5);
  return signature.substr(0, signature.front() == 'a' ? 2 : 1);
}

/// Appends values to what `Sink` builds; it has appendBasic(type, pointer), appendBytes(bytes) for an array
/// of bytes, open(type, contents) and close(), with the types of D-Bus. All give a negative errno on failure,
/// as everything here does.
template <class Sink>
class Writer {
 public:
  /// `sink` is borrowed. `descriptors`: large data may travel as descriptors.
  Writer(Sink& sink, bool descriptors) : sink_(sink), descriptors_(descriptors) {}

  /// One value per complete type of `signature`.
  int appendAll(std::span<const Value> values, std::string_view signature) {
    for (const Value& value : values) {
      if (signature.empty()) return -EINVAL;
      const std::string_view type = firstType(signature);
      if (const int result = append(value, type); result < 0) return result;
      signature.remove_prefix(type.size());
    }
    return signature.empty() ? 0 : -EINVAL;
  }

 private:
  /// Appends `value` as `type`, one complete type of a member's signature.
  int append(const Value& value, std::string_view type) {
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

  int number(const Value& value, char type) {
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
  int basic(char type, T value) {
    return sink_.appendBasic(type, &value);
  }

  int text(const std::string& value) { return sink_.appendBasic('s', wireText(value).c_str()); }

  /// Opens a container, runs `fill` and closes it.
  template <class Fill>
  int container(char type, const char* contents, Fill fill) {
    int result = sink_.open(type, contents);
    if (result >= 0) result = fill();
    return result < 0 ? result : sink_.close();
  }

  template <class Range, class Append>
  static int each(const Range& range, Append appendOne) {
    for (const auto& element : range) {
      if (const int result = appendOne(element); result < 0) return result;
    }
    return 0;
  }

  int dictionary(const Dictionary& value) {
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

  int strings(const Array& value) {
    return container('a', "s", [&] {
      return each(value, [&](const Value& element) {
        const auto* string = element.get<std::string>();
        return string ? text(*string) : -EINVAL;
      });
    });
  }

  int bytes(const Data& value) { return sink_.appendBytes(value.bytes()); }

  int variant(const Value& value) {
    return value.visit([&](const auto& held) { return variantOf(held); });
  }

  template <class T>
  int simple(const char* type, T value) {
    return container('v', type, [&] { return basic(*type, value); });
  }
  int variantOf(std::monostate) { return -EINVAL; }
  int variantOf(bool value) { return simple<int>("b", value ? 1 : 0); }
  int variantOf(std::int32_t value) { return simple("i", value); }
  int variantOf(std::uint32_t value) { return simple("u", value); }
  int variantOf(std::int64_t value) { return simple("x", value); }
  int variantOf(std::uint64_t value) { return simple("t", value); }
  int variantOf(double value) { return simple("d", value); }
  int variantOf(const std::string& value) {
    return container('v', "s", [&] { return text(value); });
  }
  int variantOf(const Url& value) { return variantOf(value.text()); }
  int variantOf(const Endpoint& value) { return variantOf(value.address); }
  int variantOf(const Error& value) { return variantOf(dictionaryOf(value)); }
  int variantOf(const Dictionary& value) {
    return container('v', "a{sv}", [&] { return dictionary(value); });
  }
  int variantOf(const IndexSet& value) {
    return container('v', "at", [&] {
      return container('a', "t", [&] {
        return each(value.indexes, [&](std::uint64_t index) { return basic('t', index); });
      });
    });
  }
  int variantOf(const Data& value) {
    if (descriptors_ && isLarge(value)) return descriptorOf(value);
    return container('v', "ay", [&] { return bytes(value); });
  }
  int variantOf(const SharedBuffer& value) { return descriptorAndSize(value.fd(), value.size()); }
  int variantOf(const Array& value) {
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
  int descriptorOf(const Data& value) {
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

  int descriptorAndSize(int fd, std::uint64_t size) {
    return container('v', "(ht)", [&] {
      return container('r', "ht", [&] {
        const int result = basic('h', fd);
        return result < 0 ? result : basic('t', size);
      });
    });
  }

  Array::Kind kindOf(const Array& array) {
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

  Sink& sink_;
  const bool descriptors_;
};

}  // namespace brivo::zeph
