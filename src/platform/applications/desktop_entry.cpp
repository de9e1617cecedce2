// SPDX-License-Identifier: MIT
#include "platform/applications/desktop_entry.h"

namespace brivo {

namespace {

std::string_view nextLine(std::string_view& text) {
  const auto end = text.find('\n');
  std::string_view line = text.substr(0, end);
  text = end == std::string_view::npos ? std::string_view() : text.substr(end + 1);
  if (line.ends_with('\r')) line.remove_suffix(1);
  return line;
}

std::string_view trimmed(std::string_view text) {
  const auto first = text.find_first_not_of(" \t");
  if (first == std::string_view::npos) return {};
  return text.substr(first, text.find_last_not_of(" \t") - first + 1);
}

/// Undoes the escapes that every string value may have.
std::string unescaped(std::string_view value) {
  std::string plain;
  for (std::size_t i = 0; i < value.size(); ++i) {
    if (value[i] != '\\' || i + 1 == value.size()) {
      plain += value[i];
      continue;
    }
    switch (const char c = value[++i]) {
      case 's':
        plain += ' ';
        break;
      case 'n':
        plain += '\n';
        break;
      case 't':
        plain += '\t';
        break;
      case 'r':
        plain += '\r';
        break;
      case '\\':
        plain += '\\';
        break;
      default:
        plain += {'\\', c};
    }
  }
  return plain;
}

/// The first argument of a command line with the quoting rules of the "Exec" key.
std::string firstWord(std::string_view command) {
  command = trimmed(command);
  if (!command.starts_with('"')) return std::string(command.substr(0, command.find_first_of(" \t")));
  std::string word;
  for (std::size_t i = 1; i < command.size() && command[i] != '"'; ++i) {
    if (command[i] == '\\' && i + 1 < command.size()) ++i;
    word += command[i];
  }
  return word;
}

}  // namespace

std::optional<DesktopEntry> parseDesktopEntry(std::string_view text) {
  bool inEntry = false;
  bool application = false;
  bool deleted = false;
  DesktopEntry entry;
  while (!text.empty()) {
    const std::string_view line = trimmed(nextLine(text));
    if (line.starts_with('[')) {
      inEntry = line == "[Desktop Entry]";
      continue;
    }
    const auto equals = line.find('=');
    if (!inEntry || line.starts_with('#') || equals == std::string_view::npos) continue;
    const std::string_view key = trimmed(line.substr(0, equals));
    const std::string_view value = trimmed(line.substr(equals + 1));
    if (key == "Type") application = value == "Application";
    if (key == "Hidden") deleted = value == "true";
    if (key == "Exec") entry.program = firstWord(unescaped(value));
  }
  if (!application || deleted || entry.program.empty()) return std::nullopt;
  return entry;
}

}  // namespace brivo
