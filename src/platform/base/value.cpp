// SPDX-License-Identifier: MIT
#include "platform/base/value.h"

#include <fmt/format.h>

#include <algorithm>
#include <limits>

namespace brivo {

Array::Array(Kind kind) : kind_(kind) {}
Array::Array(std::initializer_list<Value> elements) : kind_(Kind::any), elements_(elements) {}
Array::Array(const Array&) = default;
Array::Array(Array&&) noexcept = default;
Array& Array::operator=(const Array&) = default;
Array& Array::operator=(Array&&) noexcept = default;
Array::~Array() = default;

void Array::append(Value value) { elements_.push_back(std::move(value)); }
void Array::reserve(std::size_t count) { elements_.reserve(count); }
std::size_t Array::size() const { return elements_.size(); }
const Value& Array::operator[](std::size_t index) const { return elements_[index]; }
const Value* Array::begin() const { return elements_.data(); }
const Value* Array::end() const { return elements_.data() + elements_.size(); }
bool operator==(const Array& a, const Array& b) { return a.elements_ == b.elements_; }

Dictionary::Dictionary() = default;
Dictionary::Dictionary(std::initializer_list<Entry> entries) {
  for (const auto& [key, value] : entries) set(key, value);
}
Dictionary::Dictionary(const Dictionary&) = default;
Dictionary::Dictionary(Dictionary&&) noexcept = default;
Dictionary& Dictionary::operator=(const Dictionary&) = default;
Dictionary& Dictionary::operator=(Dictionary&&) noexcept = default;
Dictionary::~Dictionary() = default;

void Dictionary::set(std::string_view key, Value value) {
  const auto entry = std::ranges::find(entries_, key, &Entry::first);
  if (entry != entries_.end()) {
    entry->second = std::move(value);
  } else {
    entries_.emplace_back(std::string(key), std::move(value));
  }
}

void Dictionary::remove(std::string_view key) {
  std::erase_if(entries_, [&](const Entry& entry) { return entry.first == key; });
}

void Dictionary::merge(const Dictionary& other) {
  for (const auto& [key, value] : other) set(key, value);
}

std::size_t Dictionary::size() const { return entries_.size(); }
const Dictionary::Entry* Dictionary::begin() const { return entries_.data(); }
const Dictionary::Entry* Dictionary::end() const { return entries_.data() + entries_.size(); }

const Value* Dictionary::find(std::string_view key) const {
  const auto entry = std::ranges::find(entries_, key, &Entry::first);
  return entry == entries_.end() ? nullptr : &entry->second;
}

std::optional<bool> Dictionary::boolean(std::string_view key) const {
  const Value* value = find(key);
  return value ? value->asBoolean() : std::nullopt;
}

std::optional<std::int64_t> Dictionary::signedInteger(std::string_view key) const {
  const Value* value = find(key);
  return value ? value->asSigned() : std::nullopt;
}

std::optional<std::uint64_t> Dictionary::unsignedInteger(std::string_view key) const {
  const Value* value = find(key);
  return value ? value->asUnsigned() : std::nullopt;
}

std::optional<double> Dictionary::real(std::string_view key) const {
  const Value* value = find(key);
  return value ? value->asReal() : std::nullopt;
}

namespace {

template <class T>
const T* member(const Dictionary& dictionary, std::string_view key) {
  const Value* value = dictionary.find(key);
  return value ? value->get<T>() : nullptr;
}

}  // namespace

const std::string* Dictionary::string(std::string_view key) const { return member<std::string>(*this, key); }
const Array* Dictionary::array(std::string_view key) const { return member<Array>(*this, key); }
const Dictionary* Dictionary::dictionary(std::string_view key) const {
  return member<Dictionary>(*this, key);
}
const Data* Dictionary::data(std::string_view key) const { return member<Data>(*this, key); }

bool operator==(const Dictionary& a, const Dictionary& b) {
  return a.size() == b.size() && std::ranges::all_of(a, [&](const Dictionary::Entry& entry) {
           const Value* other = b.find(entry.first);
           return other && *other == entry.second;
         });
}

namespace {

template <class T>
constexpr bool kIsNumber = std::is_arithmetic_v<T>;

template <class Integer>
Integer truncated(double value) {
  using Limits = std::numeric_limits<Integer>;
  if (!(value == value)) return 0;
  if (value <= static_cast<double>(Limits::min())) return Limits::min();
  if (value >= static_cast<double>(Limits::max())) return Limits::max();
  return static_cast<Integer>(value);
}

/// Unsigned 64-bit numbers above the signed range become its maximum.
std::int64_t toSigned(std::uint64_t value) {
  constexpr auto limit = std::numeric_limits<std::int64_t>::max();
  return value > static_cast<std::uint64_t>(limit) ? limit : static_cast<std::int64_t>(value);
}

template <class Result, class Convert>
std::optional<Result> number(const Value& value, Convert convert) {
  return value.visit([&]<class T>(const T& held) -> std::optional<Result> {
    if constexpr (kIsNumber<T>) {
      return convert(held);
    } else {
      return std::nullopt;
    }
  });
}

struct Describe {
  std::string operator()(std::monostate) const { return "(none)"; }
  std::string operator()(bool value) const { return value ? "true" : "false"; }
  template <class Number>
  requires std::is_arithmetic_v<Number> std::string operator()(Number value) const {
    return fmt::format("{}", value);
  }
  std::string operator()(const std::string& value) const { return value; }
  std::string operator()(const Data& value) const { return fmt::format("<{} bytes>", value.size()); }
  std::string operator()(const SharedBuffer& value) const {
    return fmt::format("<buffer of {} bytes>", value.size());
  }
  std::string operator()(const Url& value) const { return value.text(); }
  std::string operator()(const Endpoint& value) const { return value.address; }
  std::string operator()(const IndexSet& value) const {
    return fmt::format("<{} indexes>", value.indexes.size());
  }
  std::string operator()(const Error& value) const {
    return fmt::format("{} {}: {}", value.domain, value.code, value.text);
  }
  std::string operator()(const Array& value) const {
    std::string text;
    for (const Value& element : value) text += (text.empty() ? "" : ", ") + describe(element);
    return "(" + text + ")";
  }
  std::string operator()(const Dictionary& value) const {
    std::string text;
    for (const auto& [key, entry] : value) {
      text += fmt::format("{}{} = {}", text.empty() ? "" : "; ", key, describe(entry));
    }
    return "{" + text + "}";
  }
};

}  // namespace

Value::Class Value::valueClass() const {
  struct {
    Class operator()(std::monostate) const { return Class::none; }
    Class operator()(const std::string&) const { return Class::string; }
    Class operator()(const Data&) const { return Class::data; }
    Class operator()(const SharedBuffer&) const { return Class::buffer; }
    Class operator()(const Url&) const { return Class::url; }
    Class operator()(const Endpoint&) const { return Class::endpoint; }
    Class operator()(const IndexSet&) const { return Class::indexSet; }
    Class operator()(const Error&) const { return Class::error; }
    Class operator()(const Array&) const { return Class::array; }
    Class operator()(const Dictionary&) const { return Class::dictionary; }
  } classOf;
  return visit([&]<class T>(const T& held) {
    if constexpr (kIsNumber<T>) {
      return Class::number;
    } else {
      return classOf(held);
    }
  });
}

std::optional<bool> Value::asBoolean() const {
  return number<bool>(*this, [](auto held) { return held != decltype(held){}; });
}

std::optional<std::int64_t> Value::asSigned() const {
  return number<std::int64_t>(*this, []<class T>(T held) {
    if constexpr (std::is_same_v<T, double>) {
      return truncated<std::int64_t>(held);
    } else if constexpr (std::is_same_v<T, std::uint64_t>) {
      return toSigned(held);
    } else {
      return std::int64_t{held};
    }
  });
}

std::optional<std::uint64_t> Value::asUnsigned() const {
  return number<std::uint64_t>(*this, []<class T>(T held) {
    if constexpr (std::is_same_v<T, double>) {
      return truncated<std::uint64_t>(held);
    } else {
      return static_cast<std::uint64_t>(held);
    }
  });
}

std::optional<double> Value::asReal() const {
  return number<double>(*this, [](auto held) { return static_cast<double>(held); });
}

std::string describe(const Value& value) { return value.visit(Describe{}); }

}  // namespace brivo
