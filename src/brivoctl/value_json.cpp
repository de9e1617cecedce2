// SPDX-License-Identifier: MIT
#include "brivoctl/value_json.h"

#include <fmt/format.h>

#include "brivoctl/hexadecimal.h"
#include "platform/base/base64.h"

namespace brivoctl {

namespace {

template <class... Cases>
struct Overloaded : Cases... {
  using Cases::operator()...;
};
template <class... Cases>
Overloaded(Cases...) -> Overloaded<Cases...>;

constexpr std::size_t kMostShownBytes = 32;

std::string shownBytes(const brivo::Data& data) {
  if (data.size() <= kMostShownBytes) return hexOf(data.bytes());
  return fmt::format("{} bytes", data.size());
}

std::string shownValue(const orvid::Value& value) {
  if (const auto* text = value.get<std::string>()) return shown(*text);
  if (const auto* data = value.get<brivo::Data>()) return shownBytes(*data);
  if (const auto* array = value.get<brivo::Array>()) {
    std::string line;
    for (const orvid::Value& element : *array) line += (line.empty() ? "" : ", ") + shownValue(element);
    return line;
  }
  return shown(brivo::describe(value));
}

void addLines(std::string& lines, const orvid::Dictionary& dictionary, std::size_t depth) {
  const std::string indent(2 * depth, ' ');
  for (const auto& [key, value] : dictionary) {
    if (const auto* nested = value.get<orvid::Dictionary>()) {
      lines += indent + shown(key) + "\n";
      addLines(lines, *nested, depth + 1);
    } else {
      lines += fmt::format("{}{}: {}\n", indent, shown(key), shownValue(value));
    }
  }
}

}  // namespace

Json jsonOf(const orvid::Value& value) {
  return value.visit(Overloaded{
      [](const orvid::Dictionary& dictionary) { return jsonOf(dictionary); },
      [](const brivo::Array& array) {
        Json elements = Json::array();
        for (const orvid::Value& element : array) elements.push_back(jsonOf(element));
        return elements;
      },
      [](const brivo::Data& data) { return Json(brivo::encodeBase64(data.bytes())); },
      [](const std::string& text) { return Json(text); },
      [](std::monostate) { return Json(); },
      [&]<class Other>(const Other& other) {
        if constexpr (std::is_arithmetic_v<Other>) {
          return Json(other);
        } else {
          return Json(brivo::describe(value));
        }
      },
  });
}

Json jsonOf(const orvid::Dictionary& dictionary) {
  Json object = Json::object();
  for (const auto& [key, value] : dictionary) object[key] = jsonOf(value);
  return object;
}

std::string linesOf(const orvid::Dictionary& dictionary) {
  std::string lines;
  addLines(lines, dictionary, 0);
  return lines;
}

}  // namespace brivoctl
