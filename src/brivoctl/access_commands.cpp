// SPDX-License-Identifier: MIT
// access list|grant|revoke|whoami
#include <fmt/core.h>

#include <algorithm>
#include <memory>

#include "access/access_database.h"
#include "access/device_access_manager.h"
#include "brivoctl/command.h"
#include "brivoctl/output.h"
#include "platform/applications/desktop_catalogue.h"
#include "platform/base/paths.h"
#include "platform/identity/task_identity.h"
#include "platform/settings/folders.h"
#include "platform/settings/settings.h"

namespace brivoctl {

namespace {

std::string identifierIn(const brivo::Dictionary& row) {
  const std::string* identifier = row.string("bundle_id");
  return identifier ? *identifier : std::string();
}

/// The access database of this user. A running service reads it for every new connection.
class Grants {
 public:
  Grants()
      : folder_(brivo::appendingPathComponent(brivo::Settings::fromEnvironment().dataHome,
                                              "org.orvid.imagecapture")),
        database_(pool_, madeBelowBase(folder_)) {}

  std::vector<brivo::Dictionary> rows() {
    return database_.bundleIdentifiersAccessingExternalCamerasWithStatus();
  }
  bool isKnown(const std::string& identifier) {
    return anyRow(identifier, [](const auto&) { return true; });
  }
  bool isGranted(const std::string& identifier) {
    return anyRow(identifier, [](const auto& row) { return row.boolean("whitelisted").value_or(false); });
  }
  /// One confirmed grant, however many there were.
  void grant(const std::string& identifier) {
    if (isKnown(identifier)) {
      database_.updateApplicationWithBundleIdentifier(identifier, true);
    } else {
      database_.addApplicationWithBundleIdentifier(identifier, true);
    }
  }
  void revoke(const std::string& identifier) { database_.revokeApplicationWithBundleIdentifier(identifier); }
  const std::string& folder() const { return folder_; }

 private:
  template <class Test>
  bool anyRow(const std::string& identifier, Test test) {
    return std::ranges::any_of(
        rows(), [&](const brivo::Dictionary& row) { return identifierIn(row) == identifier && test(row); });
  }
  static const std::string& madeBelowBase(const std::string& folder) {
    (void)brivo::makeBaseDirectory(std::string(brivo::parentPath(folder)));  // or else nothing can be stored
    return folder;
  }

  const std::string folder_;
  brivo::Pool pool_;
  brivo::AccessDatabase database_;
};

ExitCode cannotStore(const Grants& grants) {
  return fail("the access database in " + shown(grants.folder()) +
              " cannot be written; BRIVOD_DEBUG=1 brivoctl says why");
}

ExitCode listGrants(const CommonOptions& common) {
  Json list = Json::array();
  Grants grants;
  for (const auto& row : grants.rows()) {
    list.push_back(
        {{"identifier", identifierIn(row)}, {"granted", row.boolean("whitelisted").value_or(false)}});
  }
  if (common.json) {
    printJson(list);
    return kSuccess;
  }
  for (const Json& row : list) {
    printLine(fmt::format("{:<10}  {}", row["granted"].get<bool>() ? "granted" : "unconfirmed",
                          shown(row["identifier"].get<std::string>())));
  }
  return kSuccess;
}

ExitCode grant(const CommonOptions& common, const std::string& identifier) {
  Grants grants;
  grants.grant(identifier);
  if (!grants.isGranted(identifier)) return cannotStore(grants);
  if (common.json) printJson({{"identifier", identifier}, {"granted", true}});
  return kSuccess;
}

ExitCode revoke(const CommonOptions& common, const std::string& identifier) {
  Grants grants;
  if (!grants.isKnown(identifier)) return fail(shown(identifier) + " has no grant");
  grants.revoke(identifier);
  if (grants.isKnown(identifier)) return cannotStore(grants);
  if (common.json) printJson({{"identifier", identifier}, {"granted", false}});
  return kSuccess;
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

}  // namespace

void addAccessCommands(CLI::App& app, CommonOptions& common, ExitCode& exitCode) {
  CLI::App* access = app.add_subcommand("access", "Who may use the cameras");
  access->require_subcommand(1);
  access->footer(
      "An application is known by its Flatpak or snap name, by its desktop file, or by the absolute path of "
      "its "
      "program. Grants count from the application's next start on.");
  const auto add = [&](const char* name, const char* text) {
    CLI::App* command = access->add_subcommand(name, text);
    command->add_flag("--json", common.json, "Print JSON");
    return command;
  };
  add("list", "List the grants")->callback([&] { exitCode = listGrants(common); });
  add("whoami", "Print the identifier that this program is known by")->callback([&] {
    exitCode = whoAmI(common);
  });
  const auto identifier = std::make_shared<std::string>();
  CLI::App* granting = add("grant", "Let an application use the cameras");
  granting->add_option("IDENTIFIER", *identifier, "Which application")->required();
  granting->callback([&common, &exitCode, identifier] { exitCode = grant(common, *identifier); });
  CLI::App* revoking = add("revoke", "Take an application's grants back");
  revoking->add_option("IDENTIFIER", *identifier, "Which application")->required();
  revoking->callback([&common, &exitCode, identifier] { exitCode = revoke(common, *identifier); });
}

}  // namespace brivoctl
