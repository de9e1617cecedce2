// SPDX-License-Identifier: MIT
// access list|grant|revoke|ask|whoami
#include <fmt/core.h>

#include <memory>

#include "access/device_access_manager.h"
#include "brivoctl/access_question.h"
#include "brivoctl/command.h"
#include "brivoctl/grants.h"
#include "brivoctl/output.h"
#include "platform/applications/desktop_catalogue.h"
#include "platform/identity/task_identity.h"
#include "platform/settings/settings.h"

namespace brivoctl {

namespace {

/// What the subcommands are told.
struct AccessOptions {
  std::string identifier;
  bool control = false;
};

std::unique_ptr<Grants> grantsIn(AccessFile& file, bool control) {
  if (control) return std::make_unique<ControlGrants>(file.database());
  return std::make_unique<AccessGrants>(file.database());
}

using Table = brivo::AccessDatabase::Table;

std::optional<std::string> whyUnreadable(AccessFile& file, bool control) {
  return file.database().whyUnreadable(control ? Table::control : Table::access);
}

ExitCode listGrants(const CommonOptions& common, const AccessOptions& options) {
  AccessFile file;
  if (const auto why = whyUnreadable(file, options.control)) return cannotRead(file, *why);
  const auto grants = grantsIn(file, options.control)->list();
  if (common.json) {
    Json list = Json::array();
    for (const Grant& grant : grants) {
      list.push_back({{"identifier", grant.identifier}, {"granted", grant.isGranted}});
    }
    printJson(list);
    return kSuccess;
  }
  for (const Grant& grant : grants) {
    printLine(
        fmt::format("{:<10}  {}", grant.isGranted ? "granted" : "unconfirmed", shown(grant.identifier)));
  }
  return kSuccess;
}

ExitCode grant(const CommonOptions& common, const AccessOptions& options) {
  AccessFile file;
  const auto grants = grantsIn(file, options.control);
  grants->grant(options.identifier);
  if (!grants->isGranted(options.identifier)) return cannotStore(file);
  if (common.json) printJson({{"identifier", options.identifier}, {"granted", true}});
  return kSuccess;
}

ExitCode revoke(const CommonOptions& common, const AccessOptions& options) {
  AccessFile file;
  if (const auto why = whyUnreadable(file, options.control)) return cannotRead(file, *why);
  const auto grants = grantsIn(file, options.control);
  if (!grants->isKnown(options.identifier)) return fail(shown(options.identifier) + " has no grant");
  grants->revoke(options.identifier);
  if (grants->isKnown(options.identifier)) return cannotStore(file);
  if (common.json) printJson({{"identifier", options.identifier}, {"granted", false}});
  return kSuccess;
}

ExitCode ask(const CommonOptions& common, const AccessOptions& options) {
  return options.control ? askForControl(common, options.identifier)
                         : askForAccess(common, options.identifier);
}

ExitCode whoAmI(const CommonOptions& common) {
  const auto settings = brivo::Settings::fromEnvironment();
  const brivo::DesktopCatalogue applications(settings.dataHome, settings.dataDirs,
                                             std::string(brivo::kVendorPrefix));
  const auto identifier =
      brivo::TaskIdentity(applications).codeSigningIdentifier(brivo::AuditToken::ofThisProcess());
  if (!identifier) return fail("the system does not tell who this program is");
  const bool builtIn =
      brivo::OVDeviceAccessManager::internalApplicationWithBundleIdentifierHasAccess(*identifier);
  if (common.json) {
    printJson({{"identifier", *identifier}, {"builtIn", builtIn}});
  } else {
    printLine(fmt::format("{}{}", shown(*identifier), builtIn ? "  (built in: always has access)" : ""));
  }
  return kSuccess;
}

/// Adds the subcommands one by one.
class AccessCommands {
 public:
  using Command = ExitCode (*)(const CommonOptions&, const AccessOptions&);

  AccessCommands(CLI::App& access, CommonOptions& common, ExitCode& exitCode)
      : access_(access), common_(common), exitCode_(exitCode) {}

  CLI::App* add(const char* name, const char* text) {
    CLI::App* command = access_.add_subcommand(name, text);
    command->add_flag("--json", common_.json, "Print JSON");
    return command;
  }

  /// For grants of both kinds.
  CLI::App* addForGrants(const char* name, const char* text, Command run) {
    CLI::App* command = add(name, text);
    command->add_flag("--control", options_->control, "To control cameras, instead of using them");
    command->callback([&common = common_, &exitCode = exitCode_, options = options_, run] {
      exitCode = run(common, *options);
    });
    return command;
  }

  /// For grants of one application.
  void addForOne(const char* name, const char* text, Command run) {
    const auto notEmpty = [](const std::string& value) {
      return value.empty() ? std::string("An application has a name") : std::string();
    };
    addForGrants(name, text, run)
        ->add_option("IDENTIFIER", options_->identifier, "Which application")
        ->required()
        ->check(notEmpty);
  }

 private:
  CLI::App& access_;
  CommonOptions& common_;
  ExitCode& exitCode_;
  const std::shared_ptr<AccessOptions> options_ = std::make_shared<AccessOptions>();
};

}  // namespace

void addAccessCommands(CLI::App& app, CommonOptions& common, ExitCode& exitCode) {
  CLI::App* access = app.add_subcommand("access", "Who may use the cameras");
  access->require_subcommand(1);
  access->footer(
      "An application is known by its Flatpak or snap name, by its desktop file, or by the absolute path of "
      "its program. Grants count from the application's next start on.\n"
      "\"ask\" shows a notification with buttons and waits for the answer; it ends with 0 when the "
      "application may, with 4 when it may not, and with 1 when nobody can be asked.");
  AccessCommands commands(*access, common, exitCode);
  commands.addForGrants("list", "List the grants", listGrants);
  commands.addForOne("grant", "Let an application use the cameras", grant);
  commands.addForOne("revoke", "Take an application's grants back", revoke);
  commands.addForOne("ask", "Ask the user on the screen to let an application use the cameras", ask);
  commands.add("whoami", "Print the identifier that this program is known by")
      ->callback([&common, &exitCode] { exitCode = whoAmI(common); });
}

}  // namespace brivoctl
