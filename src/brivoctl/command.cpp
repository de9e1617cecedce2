// SPDX-License-Identifier: MIT
#include "brivoctl/command.h"

#include <fmt/core.h>

#include <charconv>
#include <cstdio>
#include <system_error>

#include "brivoctl/code_explanations.h"

namespace brivoctl {

namespace {

constexpr double kMostSeconds = 86'400;

/// What is wrong with `argument` as a time to wait; empty when nothing is.
std::string secondsError(const std::string& argument) {
  double seconds = -1;
  const char* end = argument.data() + argument.size();
  const auto parsed = std::from_chars(argument.data(), end, seconds);
  const bool isTime =
      parsed.ec == std::errc() && parsed.ptr == end && seconds >= 0 && seconds <= kMostSeconds;
  return isTime ? "" : argument + " is no number of seconds from 0 to 86400";
}

/// An error code and what is known of it, to go behind a text.
std::string inBrackets(std::int32_t code) {
  const std::string description = describeError(code);
  return description.empty() ? fmt::format(" (error {})", code)
                             : fmt::format(" (error {}, {})", code, description);
}

}  // namespace

ExitCode fail(const std::string& text, ExitCode code) {
  std::fputs(("brivoctl: " + text + "\n").c_str(), stderr);
  return code;
}

std::string textOf(const orvid::Error& error) {
  switch (error.kind) {
    case orvid::ErrorKind::noService:
      return "no service: " + error.text;
    case orvid::ErrorKind::refused:
      return error.text + "; see brivoctl access --help";
    default:
      return error.code == 0 ? error.text : error.text + inBrackets(error.code);
  }
}

ExitCode exitCodeOf(const orvid::Error& error) {
  switch (error.kind) {
    case orvid::ErrorKind::noService:
      return kNoService;
    case orvid::ErrorKind::refused:
      return kRefused;
    default:
      return kFailure;
  }
}

ExitCode report(const orvid::Error& error) { return fail(textOf(error), exitCodeOf(error)); }

CLI::App* addServiceCommand(CLI::App& app, CommonOptions& common, const char* name, const char* text) {
  CLI::App* command = app.add_subcommand(name, text);
  command->add_flag("--json", common.json, "Print JSON");
  command->add_option("--address", common.address, "D-Bus address of the service");
  command->add_option("--timeout", common.timeout, "Seconds to wait for each answer")
      ->check(secondsError)
      ->capture_default_str();
  return command;
}

}  // namespace brivoctl
