// SPDX-License-Identifier: MIT
// What the subcommands share.
#pragma once

#include <CLI/CLI.hpp>
#include <string>
#include <vector>

#include "orvidcore/orvidcore.h"

namespace brivoctl {

/// How the program ends.
enum ExitCode { kSuccess = 0, kFailure = 1, kUsage = 2, kNoService = 3, kRefused = 4 };

/// The options of every subcommand.
struct CommonOptions {
  bool json = false;
  std::string address;  ///< of the service; empty for the usual place
  double timeout = 30;  ///< seconds for each answer

  orvid::Timeout wait() const { return orvid::Timeout(static_cast<std::int64_t>(timeout * 1000)); }
};

/// An error as one line for people, and the exit code for it.
std::string textOf(const orvid::Error& error);
ExitCode exitCodeOf(const orvid::Error& error);
/// Says what went wrong on standard error and gives the exit code for it.
ExitCode report(const orvid::Error& error);
ExitCode fail(const std::string& text, ExitCode code = kFailure);

/// A subcommand that talks to the service, with the options that all of those have.
CLI::App* addServiceCommand(CLI::App& app, CommonOptions& common, const char* name, const char* text);

// Each adds its subcommands; a subcommand that runs leaves its exit code in `exitCode`.
void addDeviceCommands(CLI::App& app, CommonOptions& common, ExitCode& exitCode);
void addObjectCommands(CLI::App& app, CommonOptions& common, ExitCode& exitCode);
void addPictureCommands(CLI::App& app, CommonOptions& common, ExitCode& exitCode);
void addTransferCommands(CLI::App& app, CommonOptions& common, ExitCode& exitCode);
void addAccessCommands(CLI::App& app, CommonOptions& common, ExitCode& exitCode);
void addExplainCommands(CLI::App& app, CommonOptions& common, ExitCode& exitCode);

}  // namespace brivoctl
