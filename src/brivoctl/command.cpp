// SPDX-License-Identifier: MIT
#include "brivoctl/command.h"

#include <fmt/core.h>

namespace brivoctl {

ExitCode fail(const std::string& text, ExitCode code) {
  fmt::print(stderr, "brivoctl: {}\n", text);
  return code;
}

ExitCode report(const orvid::Error& error) {
  switch (error.kind) {
    case orvid::ErrorKind::noService:
      return fail("no service: " + error.text, kNoService);
    case orvid::ErrorKind::refused:
      return fail(error.text + "; see brivoctl access --help", kRefused);
    default:
      return fail(error.code == 0 ? error.text : fmt::format("{} (error {})", error.text, error.code));
  }
}

CLI::App* addServiceCommand(CLI::App& app, CommonOptions& common, const char* name, const char* text) {
  CLI::App* command = app.add_subcommand(name, text);
  command->add_flag("--json", common.json, "Print JSON");
  command->add_option("--address", common.address, "D-Bus address of the service");
  command->add_option("--timeout", common.timeout, "Seconds to wait for each answer")->capture_default_str();
  return command;
}

}  // namespace brivoctl
