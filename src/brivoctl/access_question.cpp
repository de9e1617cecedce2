// SPDX-License-Identifier: MIT
#include "brivoctl/access_question.h"

#include <fmt/core.h>

#include <cstdio>
#include <optional>

#include "access/device_access_manager.h"
#include "brivoctl/access_alert.h"
#include "brivoctl/asker.h"
#include "brivoctl/grants.h"
#include "brivoctl/output.h"
#include "platform/applications/desktop_catalogue.h"
#include "platform/settings/settings.h"
#include "platform/text/message_catalogue.h"

namespace brivoctl {

namespace {

using Manager = brivo::OVDeviceAccessManager;
using Response = brivo::UserAlert::Response;

/// What an application is asked about for.
class Right {
 public:
  virtual ~Right() = default;
  /// As in "may use the cameras".
  virtual std::string verb() const = 0;
  virtual brivo::Dictionary alert(const std::string& identifier) const = 0;
  /// The answer that there is without asking.
  virtual std::optional<bool> known(Manager& manager, const std::string& identifier) const = 0;
  virtual bool validate(Manager& manager, const std::string& identifier,
                        const brivo::Dictionary& alert) const = 0;
  virtual bool isStored(brivo::AccessDatabase& database, const std::string& identifier) const = 0;
  /// What a person has to know about a refusal.
  virtual std::string afterRefusal(const std::string& identifier) const = 0;
};

class Access final : public Right {
 public:
  std::string verb() const override { return "use"; }
  brivo::Dictionary alert(const std::string& identifier) const override { return accessAlert(identifier); }
  std::optional<bool> known(Manager& manager, const std::string& identifier) const override {
    bool enabled = false;
    if (!manager.applicationWithBundleIdentifierHasAccess(identifier, enabled)) return std::nullopt;
    return enabled;
  }
  bool validate(Manager& manager, const std::string& identifier,
                const brivo::Dictionary& alert) const override {
    return manager.validateBundleIdentifier(identifier, &alert);
  }
  bool isStored(brivo::AccessDatabase& database, const std::string& identifier) const override {
    return AccessGrants(database).isGranted(identifier);
  }
  std::string afterRefusal(const std::string&) const override { return {}; }
};

class Control final : public Right {
 public:
  std::string verb() const override { return "control"; }
  brivo::Dictionary alert(const std::string& identifier) const override { return controlAlert(identifier); }
  std::optional<bool> known(Manager& manager, const std::string& identifier) const override {
    if (!manager.controlApplicationWithBundleIdentifierHasAccess(identifier)) return std::nullopt;
    return true;
  }
  bool validate(Manager& manager, const std::string& identifier,
                const brivo::Dictionary& alert) const override {
    return manager.validateControlApplicationBundleIdentifier(identifier, &alert);
  }
  bool isStored(brivo::AccessDatabase& database, const std::string& identifier) const override {
    return ControlGrants(database).isKnown(identifier);
  }
  std::string afterRefusal(const std::string& identifier) const override {
    return fmt::format("; from now on it counts as granted: brivoctl access revoke --control {} ends that",
                       shown(identifier));
  }
};

/// Gives the manager the answer that the user has given already.
class GivenAnswer final : public brivo::UserAlerts {
 public:
  explicit GivenAnswer(Response response) : response_(response) {}

  std::unique_ptr<brivo::UserAlert> show(const brivo::Dictionary&) override {
    class Answered final : public brivo::UserAlert {
     public:
      explicit Answered(Response response) : response_(response) {}
      Response waitForResponse() override { return response_; }

     private:
      const Response response_;
    };
    return std::make_unique<Answered>(response_);
  }

 private:
  const Response response_;
};

void printAnswer(const CommonOptions& common, const std::string& identifier, const Right& right, bool granted,
                 bool asked) {
  if (common.json) {
    printJson({{"identifier", identifier}, {"granted", granted}, {"asked", asked}});
  } else if (granted) {
    printLine(fmt::format("{} may {} the cameras", shown(identifier), right.verb()));
  }
}

ExitCode tellKnown(const CommonOptions& common, const std::string& identifier, const Right& right,
                   bool granted) {
  printAnswer(common, identifier, right, granted, false);
  if (granted) return kSuccess;
  return fail(fmt::format("{0} has a grant that was not confirmed, and is not asked about; brivoctl access "
                          "grant {0} confirms it",
                          shown(identifier)),
              kRefused);
}

ExitCode tellFailure(Asker::Failure failure, const std::string& identifier) {
  if (failure == Asker::Failure::interrupted) return fail("interrupted before there was an answer");
  return fail(
      fmt::format("nobody can be asked: no program in this session shows notifications with buttons; "
                  "brivoctl access grant {} needs no answer",
                  shown(identifier)));
}

/// Such a grant does not last: see OVDeviceAccessManager.
void noteUninstalled(const brivo::InstalledApplications& applications, const std::string& identifier) {
  if (applications.isInstalled(identifier) || identifier.find(brivo::kVendorPrefix) != std::string::npos)
    return;
  std::fputs(
      ("brivoctl: " + shown(identifier) + " is not installed: what is granted to it ends at its next check\n")
          .c_str(),
      stderr);
}

ExitCode ask(const CommonOptions& common, const std::string& identifier, const Right& right) {
  brivo::speakLanguageOfUser();
  Asker asker;
  AccessFile file;
  const auto settings = brivo::Settings::fromEnvironment();
  const brivo::DesktopCatalogue applications(settings.dataHome, settings.dataDirs,
                                             std::string(brivo::kVendorPrefix));
  Manager mute(file.database(), applications, nullptr);
  if (const auto known = right.known(mute, identifier)) {
    return tellKnown(common, identifier, right, *known);
  }
  // Asked here and not by the manager, which would wait for ever where nobody can be asked.
  const auto alert = right.alert(identifier);
  const auto response = asker.ask(alert);
  if (!response.ok()) return tellFailure(response.error(), identifier);
  GivenAnswer answer(*response);
  Manager manager(file.database(), applications, &answer);
  const bool granted = right.validate(manager, identifier, alert);
  if (granted && !right.isStored(file.database(), identifier)) return cannotStore(file);
  printAnswer(common, identifier, right, granted, true);
  if (granted) noteUninstalled(applications, identifier);
  if (granted) return kSuccess;
  return fail(fmt::format("the user does not let {} {} the cameras{}", shown(identifier), right.verb(),
                          right.afterRefusal(identifier)),
              kRefused);
}

}  // namespace

ExitCode askForAccess(const CommonOptions& common, const std::string& identifier) {
  return ask(common, identifier, Access());
}

ExitCode askForControl(const CommonOptions& common, const std::string& identifier) {
  return ask(common, identifier, Control());
}

}  // namespace brivoctl
