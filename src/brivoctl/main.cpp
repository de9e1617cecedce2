// SPDX-License-Identifier: MIT
// brivoctl: the camera service on the command line.
#include "brivoctl/command.h"
#include "brivoctl/output.h"
#include "platform/logging/unified_log.h"

int main(int argc, char** argv) {
  using namespace brivoctl;
  brivo::UnifiedLog::silence();  // what goes wrong here is said in this program's own words
  CLI::App app("List, import, read and delete what is on camera cards, through the camera service.",
               "brivoctl");
  app.require_subcommand(1);
  app.set_version_flag("--version", BRIVOD_VERSION);
  app.footer(
      "DEVICE is a UUID, a unique part from the start of one, a volume name or a mount path; it may be left "
      "out when "
      "there is exactly one device.\n"
      "OBJECT is a handle or a path such as DCIM/100ABCDE/IMG_0001.JPG.\n"
      "Exit codes: 0 success, 1 the request failed, 2 wrong usage, 3 no service, 4 access refused.");
  CommonOptions common;
  ExitCode exitCode = kSuccess;
  addDeviceCommands(app, common, exitCode);
  addObjectCommands(app, common, exitCode);
  addPictureCommands(app, common, exitCode);
  addTransferCommands(app, common, exitCode);
  addAccessCommands(app, common, exitCode);
  addExplainCommands(app, common, exitCode);
  try {
    app.parse(argc, argv);
  } catch (const CLI::ParseError& error) {
    return app.exit(error) == 0 ? kSuccess : kUsage;
  }
  if (exitCode == kSuccess && outputFailed()) return fail("cannot write to standard output");
  return exitCode;
}
