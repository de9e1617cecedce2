// SPDX-License-Identifier: MIT
#include "platform/alerts/alert_text.h"

#include <array>
#include <utility>

#include "platform/text/unicode.h"

namespace brivo {

namespace {

// In code points: more than any screen shows, and far less than a message of the bus may hold.
constexpr std::size_t kLongestTitle = 200;
constexpr std::size_t kLongestMessage = 2000;
constexpr std::size_t kLongestLabel = 80;

constexpr std::size_t kLongestCodePoint = 4;  // bytes

constexpr std::array<std::pair<const char*, UserAlert::Response>, 3> kButtons{
    {{"defaultButton", UserAlert::defaultButton},
     {"alternateButton", UserAlert::alternateButton},
     {"otherButton", UserAlert::otherButton}}};

bool isControl(char16_t unit) { return unit < 0x20 || (unit >= 0x7F && unit < 0xA0); }

std::string withoutControls(std::string_view text, bool keepLines) {
  std::u16string units = toUtf16(text);
  for (char16_t& unit : units) {
    if (isControl(unit) && !(keepLines && unit == u'\n')) unit = u' ';
  }
  return toUtf8(units);
}

std::string shortened(std::string_view text, std::size_t longest, bool keepLines) {
  const std::string start = replacingNoncharacters(text.substr(0, (longest + 1) * kLongestCodePoint));
  const std::string_view kept = codePointPrefix(start, longest);
  const std::string safe = withoutControls(kept, keepLines);
  return kept.size() == start.size() ? safe : safe + "\xE2\x80\xA6";  // an ellipsis
}

std::string_view textIn(const Dictionary& alert, const char* key) {
  const std::string* text = alert.string(key);
  return text ? std::string_view(*text) : std::string_view();
}

}  // namespace

AlertText AlertText::from(const Dictionary& alert) {
  AlertText text;
  text.title = shortened(textIn(alert, "title"), kLongestTitle, false);
  text.message = shortened(textIn(alert, "message"), kLongestMessage, true);
  for (const auto& [key, response] : kButtons) {
    std::string label = shortened(textIn(alert, key), kLongestLabel, false);
    if (!label.empty()) text.buttons.push_back({response, std::move(label)});
  }
  return text;
}

std::string escapingMarkup(std::string_view text) {
  std::string escaped;
  for (const char c : text) {
    switch (c) {
      case '&':
        escaped += "&amp;";
        break;
      case '<':
        escaped += "&lt;";
        break;
      case '>':
        escaped += "&gt;";
        break;
      default:
        escaped += c;
    }
  }
  return escaped;
}

}  // namespace brivo
