// SPDX-License-Identifier: MIT
// The values that dictionaries, messages and preferences are made of.
#pragma once

#include <cstdint>
#include <functional>
#include <initializer_list>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

#include "platform/base/data.h"
#include "platform/base/shared_buffer.h"
#include "platform/base/url.h"

namespace brivo {

class Value;

/// Where a listener can be reached: a D-Bus server address (D-Bus Specification, "Server
/// Addresses").
struct Endpoint {
  std::string address;
  friend bool operator==(const Endpoint&, const Endpoint&) = default;
};

/// A set of non-negative indexes.
struct IndexSet {
  std::set<std::uint64_t> indexes;
  friend bool operator==(const IndexSet&, const IndexSet&) = default;
};

/// An error as a value: who defines the code, the code, and a text for people.
struct Error {
  std::string domain;
  std::int64_t code = 0;
  std::string text;
  friend bool operator==(const Error&, const Error&) = default;
};

/// Values in order. An array of strings or of data keeps that kind even when it is empty, because
/// the two have forms of their own on the wire. *Thread-bound.*
class Array {
 public:
  enum class Kind { any, strings, data };

  explicit Array(Kind kind = Kind::any);
  Array(std::initializer_list<Value> elements);
  Array(const Array&);
  Array(Array&&) noexcept;
  Array& operator=(const Array&);
  Array& operator=(Array&&) noexcept;
  ~Array();

  Kind kind() const { return kind_; }
  void append(Value value);
  void reserve(std::size_t count);
  std::size_t size() const;
  bool empty() const { return size() == 0; }
  const Value& operator[](std::size_t index) const;
  const Value* begin() const;
  const Value* end() const;
  friend bool operator==(const Array& a, const Array& b);

 private:
  Kind kind_;
  std::vector<Value> elements_;
};

/// Values by string key, in the order in which the keys were first set. Lookups walk the entries:
/// the dictionaries of this system hold a handful. A missing key is not an error. *Thread-bound.*
class Dictionary {
 public:
  using Entry = std::pair<std::string, Value>;

  Dictionary();
  Dictionary(std::initializer_list<Entry> entries);
  Dictionary(const Dictionary&);
  Dictionary(Dictionary&&) noexcept;
  Dictionary& operator=(const Dictionary&);
  Dictionary& operator=(Dictionary&&) noexcept;
  ~Dictionary();

  /// Replaces the value of a key that is there, else appends the entry.
  void set(std::string_view key, Value value);
  void remove(std::string_view key);
  /// Sets every entry of `other` here.
  void merge(const Dictionary& other);

  std::size_t size() const;
  bool empty() const { return size() == 0; }
  const Entry* begin() const;
  const Entry* end() const;

  /// The value of `key`, or null; valid until the dictionary changes.
  const Value* find(std::string_view key) const;
  bool contains(std::string_view key) const { return find(key) != nullptr; }

  // None when the key is missing or holds another kind of value; numbers convert as in Value.
  std::optional<bool> boolean(std::string_view key) const;
  std::optional<std::int64_t> signedInteger(std::string_view key) const;
  std::optional<std::uint64_t> unsignedInteger(std::string_view key) const;
  std::optional<double> real(std::string_view key) const;
  // Null when the key is missing or holds another kind of value; valid until the dictionary
  // changes.
  const std::string* string(std::string_view key) const;
  const Array* array(std::string_view key) const;
  const Dictionary* dictionary(std::string_view key) const;
  const Data* data(std::string_view key) const;

  /// The same keys with the same values, in any order.
  friend bool operator==(const Dictionary& a, const Dictionary& b);

 private:
  std::vector<Entry> entries_;
};

/// One value of any kind. *Thread-bound*; copies share data but nothing that can change.
class Value {
 public:
  /// The kinds that a receiver may restrict an argument to.
  enum class Class { none, number, string, data, buffer, url, endpoint, indexSet, error, array, dictionary };

  Value() = default;
  Value(bool value) : storage_(value) {}
  Value(std::int32_t value) : storage_(value) {}
  Value(std::uint32_t value) : storage_(value) {}
  Value(std::int64_t value) : storage_(value) {}
  Value(std::uint64_t value) : storage_(value) {}
  Value(double value) : storage_(value) {}
  Value(const char* value) : storage_(std::string(value)) {}
  Value(std::string_view value) : storage_(std::string(value)) {}
  Value(std::string value) : storage_(std::move(value)) {}
  Value(Data value) : storage_(std::move(value)) {}
  Value(SharedBuffer value) : storage_(std::move(value)) {}
  Value(Url value) : storage_(std::move(value)) {}
  Value(Endpoint value) : storage_(std::move(value)) {}
  Value(IndexSet value) : storage_(std::move(value)) {}
  Value(Error value) : storage_(std::move(value)) {}
  Value(Array value) : storage_(std::move(value)) {}
  Value(Dictionary value) : storage_(std::move(value)) {}

  Class valueClass() const;

  /// The alternative itself, or null when the value is of another type.
  template <class T>
  const T* get() const {
    return std::get_if<T>(&storage_);
  }

  // Numbers of every type convert into each other: fractions are cut off, what does not fit becomes
  // the nearest value that does, and a negative number read as unsigned wraps as in two's
  // complement. None for anything but a number.
  std::optional<bool> asBoolean() const;
  std::optional<std::int64_t> asSigned() const;
  std::optional<std::uint64_t> asUnsigned() const;
  std::optional<double> asReal() const;

  template <class Visitor>
  decltype(auto) visit(Visitor&& visitor) const {
    return std::visit(std::forward<Visitor>(visitor), storage_);
  }

  friend bool operator==(const Value&, const Value&) = default;

 private:
  std::variant<std::monostate, bool, std::int32_t, std::uint32_t, std::int64_t, std::uint64_t, double,
               std::string, Data, SharedBuffer, Url, Endpoint, IndexSet, Error, Array, Dictionary>
      storage_;
};

/// One line of text for people, as log lines show it; data as its size only.
std::string describe(const Value& value);

}  // namespace brivo
