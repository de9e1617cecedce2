// SPDX-License-Identifier: MIT
// explain, dataset
#include <fmt/format.h>

#include <cerrno>
#include <charconv>
#include <cstdio>
#include <cstring>
#include <memory>
#include <optional>

#include "brivoctl/code_explanations.h"
#include "brivoctl/command.h"
#include "brivoctl/output.h"
#include "brivoctl/record_json.h"

namespace brivoctl {

namespace {

/// The most bytes of a file that are decoded.
constexpr std::size_t kMostBytes = std::size_t{64} << 20U;
/// The most characters of a payload that people are shown.
constexpr std::size_t kShownPayload = 64;

/// A number in decimal or, after "0x", in hexadecimal, either with a sign; none when `text` is something
/// else.
std::optional<std::int64_t> numberIn(std::string_view text) {
  const bool negative = text.starts_with('-');
  if (negative || text.starts_with('+')) text.remove_prefix(1);
  const bool hexadecimal = text.starts_with("0x") || text.starts_with("0X");
  if (hexadecimal) text.remove_prefix(2);
  std::uint32_t number = 0;
  const char* const end = text.data() + text.size();
  const auto parsed = std::from_chars(text.data(), end, number, hexadecimal ? 16 : 10);
  if (parsed.ec != std::errc() || parsed.ptr != end) return std::nullopt;
  return negative ? -std::int64_t{number} : std::int64_t{number};
}

std::string numberError(const std::string& argument) {
  return numberIn(argument) ? "" : argument + " is no code: a number of 32 bits, decimal or with 0x";
}

Json explanationJson(const Explanation& explanation) {
  Json json{{"kind", explanation.kind}, {"code", explanation.code}, {"name", explanation.name}};
  if (!explanation.olderName.empty()) json["olderName"] = explanation.olderName;
  if (!explanation.text.empty()) json["text"] = explanation.text;
  return json;
}

std::string lineOf(const Explanation& explanation) {
  std::string line = fmt::format("{:<22}", explanation.kind);
  for (const std::string& part : {explanation.name, explanation.olderName, explanation.text}) {
    if (!part.empty()) line += "  " + part;
  }
  return line;
}

ExitCode explain(const CommonOptions& common, const std::string& argument) {
  const auto explanations = explanationsOf(*numberIn(argument));
  if (explanations.empty()) return fail(argument + " is in no table of errors or PTP codes");
  if (!common.json) {
    for (const auto& explanation : explanations) printLine(lineOf(explanation));
    return kSuccess;
  }
  Json list = Json::array();
  for (const auto& explanation : explanations) list.push_back(explanationJson(explanation));
  printJson(list);
  return kSuccess;
}

struct CloseFile {
  void operator()(std::FILE* file) const {
    if (file != stdin) std::fclose(file);
  }
};

/// Everything in the file, or on standard input for "-"; the exit code after the reason was said else.
std::variant<std::vector<std::byte>, ExitCode> contentOf(const std::string& path) {
  const std::unique_ptr<std::FILE, CloseFile> file(path == "-" ? stdin : std::fopen(path.c_str(), "rbe"));
  if (!file) return fail(shown(path) + ": " + std::strerror(errno));
  std::vector<std::byte> bytes;
  std::size_t count = 0;
  do {
    constexpr std::size_t step = 65'536;
    bytes.resize(bytes.size() + step);
    count = std::fread(bytes.data() + bytes.size() - step, 1, step, file.get());
    bytes.resize(bytes.size() - step + count);
    if (bytes.size() > kMostBytes) return fail(shown(path) + " is larger than 64 MiB");
  } while (count > 0);
  if (std::ferror(file.get())) return fail(shown(path) + ": " + std::strerror(errno));
  return bytes;
}

std::string shownValue(const std::string& key, const Json& value) {
  if (value.is_array()) {
    std::string list;
    for (const auto& element : value) list += (list.empty() ? "" : ", ") + shownValue(key, element);
    return list;
  }
  if (value.is_string()) {
    const auto text = value.get<std::string>();
    const bool cut = key == "payload" && text.size() > kShownPayload;
    return cut ? text.substr(0, kShownPayload) + "..." : shown(text);
  }
  const auto number = value.get<std::uint64_t>();
  return number < 10 ? fmt::format("{}", number) : fmt::format("{} (0x{:X})", number, number);
}

void printRecord(const Json& record) {
  for (const auto& [key, value] : record.items()) {
    const bool isTitle = key == "record";
    printLine(isTitle ? value.get<std::string>() : fmt::format("  {:<23} {}", key, shownValue(key, value)));
  }
}

ExitCode decodeFile(const CommonOptions& common, const std::string& path) {
  const auto content = contentOf(path);
  if (const auto* const code = std::get_if<ExitCode>(&content)) return *code;
  const auto& bytes = std::get<std::vector<std::byte>>(content);
  if (bytes.empty()) return fail(shown(path) + " is empty");
  std::span<const std::byte> rest = bytes;
  while (!rest.empty()) {
    const auto record = brivo::takePTPRecord(rest);
    if (!record) {
      return fail(fmt::format("{}: what is at offset {} is no whole object-info dataset or PTP container",
                              shown(path), bytes.size() - rest.size()));
    }
    const Json json = jsonOf(*record);
    common.json ? printJsonLine(json) : printRecord(json);
  }
  return kSuccess;
}

}  // namespace

void addExplainCommands(CLI::App& app, CommonOptions& common, ExitCode& exitCode) {
  const auto argument = std::make_shared<std::string>();
  CLI::App* explaining = app.add_subcommand("explain", "Say what an error or PTP code means");
  explaining->add_option("CODE", *argument, "Such as -9934 or 0x1007")->required()->check(numberError);
  explaining->callback([&common, &exitCode, argument] { exitCode = explain(common, *argument); });
  CLI::App* decoding =
      app.add_subcommand("dataset", "Decode object-info datasets and PTP containers, one after the other");
  decoding->add_option("FILE", *argument, "Where they are; - for standard input")->required();
  decoding->callback([&common, &exitCode, argument] { exitCode = decodeFile(common, *argument); });
  explaining->add_flag("--json", common.json, "Print JSON");
  decoding->add_flag("--json", common.json, "Print JSON lines, one for each record");
}

}  // namespace brivoctl
