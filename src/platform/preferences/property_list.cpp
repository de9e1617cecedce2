// SPDX-License-Identifier: MIT
#include "platform/preferences/property_list.h"

#include <fmt/format.h>

#include <charconv>
#include <pugixml.hpp>
#include <sstream>

#include "platform/base/base64.h"

namespace brivo {

namespace {

constexpr int kDeepest = 64;

std::optional<Value> parseNode(pugi::xml_node node, int depth);

std::optional<Dictionary> parseDictionary(pugi::xml_node node, int depth) {
  Dictionary dictionary;
  for (pugi::xml_node key = node.first_child(); key;) {
    const pugi::xml_node held = key.next_sibling();
    if (std::string_view(key.name()) != "key" || !held) return std::nullopt;
    auto value = parseNode(held, depth + 1);
    if (!value) return std::nullopt;
    dictionary.set(key.text().get(), std::move(*value));
    key = held.next_sibling();
  }
  return dictionary;
}

std::optional<Value> parseArray(pugi::xml_node node, int depth) {
  Array array;
  for (const pugi::xml_node child : node.children()) {
    auto value = parseNode(child, depth + 1);
    if (!value) return std::nullopt;
    array.append(std::move(*value));
  }
  return Value(std::move(array));
}

template <class Number>
std::optional<Value> parseNumber(std::string_view text) {
  Number number{};
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (error != std::errc() || end != text.data() + text.size()) return std::nullopt;
  return Value(number);
}

std::optional<Value> parseNode(pugi::xml_node node, int depth) {
  if (depth > kDeepest) return std::nullopt;
  const std::string_view name = node.name();
  const std::string_view text = node.text().get();
  if (name == "dict") {
    auto dictionary = parseDictionary(node, depth);
    return dictionary ? std::optional<Value>(std::move(*dictionary)) : std::nullopt;
  }
  if (name == "array") return parseArray(node, depth);
  if (name == "string" || name == "date") return Value(text);
  if (name == "true") return Value(true);
  if (name == "false") return Value(false);
  if (name == "real") return parseNumber<double>(text);
  if (name == "integer") {
    auto number = parseNumber<std::int64_t>(text);
    return number ? number : parseNumber<std::uint64_t>(text);
  }
  if (name == "data") {
    auto bytes = decodeBase64(text);
    return bytes ? std::optional<Value>(Data(std::move(*bytes))) : std::nullopt;
  }
  return std::nullopt;
}

void append(pugi::xml_node parent, const Value& value);

void appendText(pugi::xml_node parent, const char* element, const std::string& text) {
  parent.append_child(element).text().set(text.c_str());
}

struct Append {
  pugi::xml_node parent;

  void operator()(bool value) { parent.append_child(value ? "true" : "false"); }
  void operator()(double value) { appendText(parent, "real", fmt::format("{}", value)); }
  template <class Integer>
  requires std::is_integral_v<Integer>
  void operator()(Integer value) { appendText(parent, "integer", fmt::format("{}", value)); }
  void operator()(const std::string& value) { appendText(parent, "string", value); }
  void operator()(const Url& value) { appendText(parent, "string", value.text()); }
  void operator()(const Data& value) { appendText(parent, "data", encodeBase64(value.bytes())); }
  void operator()(const Array& value) {
    const pugi::xml_node array = parent.append_child("array");
    for (const Value& element : value) append(array, element);
  }
  void operator()(const Dictionary& value) {
    pugi::xml_node dictionary = parent.append_child("dict");
    for (const auto& [key, entry] : value) {
      appendText(dictionary, "key", key);
      append(dictionary, entry);
    }
  }
};

constexpr bool representable(Value::Class kind) {
  return kind != Value::Class::none && kind != Value::Class::endpoint && kind != Value::Class::indexSet &&
         kind != Value::Class::error;
}

void append(pugi::xml_node parent, const Value& value) {
  value.visit([&]<class T>(const T& held) {
    if constexpr (std::is_invocable_v<Append, const T&>) Append{parent}(held);
  });
}

/// `dictionary` without what has no element; a key must never stand without its value.
Dictionary representableEntries(const Dictionary& dictionary) {
  Dictionary entries;
  for (const auto& [key, value] : dictionary) {
    if (!representable(value.valueClass())) continue;
    const auto* nested = value.get<Dictionary>();
    entries.set(key, nested ? Value(representableEntries(*nested)) : value);
  }
  return entries;
}

}  // namespace

std::optional<Dictionary> parsePropertyList(std::string_view xml) {
  pugi::xml_document document;
  constexpr unsigned options = pugi::parse_default | pugi::parse_ws_pcdata_single;
  if (!document.load_buffer(xml.data(), xml.size(), options)) return std::nullopt;
  const pugi::xml_node top = document.child("plist").first_child();
  if (std::string_view(top.name()) != "dict") return std::nullopt;
  return parseDictionary(top, 0);
}

std::string formatPropertyList(const Dictionary& dictionary) {
  pugi::xml_document document;
  pugi::xml_node declaration = document.append_child(pugi::node_declaration);
  declaration.append_attribute("version") = "1.0";
  declaration.append_attribute("encoding") = "UTF-8";
  pugi::xml_node list = document.append_child("plist");
  list.append_attribute("version") = "1.0";
  append(list, representableEntries(dictionary));
  std::ostringstream text;
  document.save(text, "  ");
  return text.str();
}

}  // namespace brivo
