// SPDX-License-Identifier: MIT
#include "access/device_access_manager.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <unistd.h>

#include <atomic>
#include <functional>
#include <set>
#include <thread>

#include "support/processes.h"
#include "support/standard_error.h"
#include "support/temporary_folder.h"
#include "support/wait.h"

namespace brivo {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class Applications : public InstalledApplications {
 public:
  bool isInstalled(const std::string& identifier) const override {
    meanwhile();
    return installed.contains(identifier);
  }
  std::optional<std::string> identifierOfProgram(dev_t, ino_t) const override { return std::nullopt; }

  std::set<std::string> installed;
  std::function<void()> meanwhile = [] {};  ///< what others do after the grants were looked at
};

/// Answers every alert with the same button.
class Alerts : public UserAlerts {
 public:
  std::unique_ptr<UserAlert> show(const Dictionary& alert) override {
    ++shown;
    last = alert;
    class Answered : public UserAlert {
     public:
      explicit Answered(Response response) : response_(response) {}
      Response waitForResponse() override { return response_; }

     private:
      Response response_;
    };
    return std::make_unique<Answered>(response);
  }

  UserAlert::Response response = UserAlert::defaultButton;
  int shown = 0;
  Dictionary last;
};

class DeviceAccessManagerTest : public testing::Test {
 protected:
  test::TemporaryFolder home;
  Pool pool;
  AccessDatabase database{pool, home / "data"};
  Applications applications;
  Alerts alerts;
  OVDeviceAccessManager manager{database, applications, &alerts};
  const Dictionary alert{{"title", "May it?"}};
  const std::string app = "org.example.App";
};

TEST_F(DeviceAccessManagerTest, TheBuiltInApplicationsHaveAccessWithAnEmptyDatabase) {
  for (const char* builtIn : {"org.orvid.Photos", "org.orvid.OrvidCoreTests"}) {
    bool enabled = false;
    EXPECT_TRUE(manager.applicationWithBundleIdentifierHasAccess(builtIn, enabled));
    EXPECT_TRUE(enabled);
    EXPECT_TRUE(manager.controlApplicationWithBundleIdentifierHasAccess(builtIn));
    EXPECT_TRUE(manager.validateBundleIdentifier(builtIn, &alert));
  }
  EXPECT_FALSE(OVDeviceAccessManager::internalApplicationWithBundleIdentifierHasAccess("org.orvid.photos"));
  EXPECT_EQ(alerts.shown, 0);
}

TEST_F(DeviceAccessManagerTest, AnUnconfirmedGrantIsAccessThatIsNotEnabledAndNobodyIsAsked) {
  applications.installed = {app};
  database.addApplicationWithBundleIdentifier(app, false);
  bool enabled = true;
  EXPECT_TRUE(manager.applicationWithBundleIdentifierHasAccess(app, enabled));
  EXPECT_FALSE(enabled);
  EXPECT_FALSE(manager.validateBundleIdentifier(app, &alert));
  EXPECT_EQ(alerts.shown, 0);
}

TEST_F(DeviceAccessManagerTest, OfSeveralGrantsTheLastDecides) {
  applications.installed = {app};
  database.addApplicationWithBundleIdentifier(app, false);
  database.addApplicationWithBundleIdentifier(app, true);
  bool enabled = false;
  EXPECT_TRUE(manager.applicationWithBundleIdentifierHasAccess(app, enabled));
  EXPECT_TRUE(enabled);
}

TEST_F(DeviceAccessManagerTest, AnUninstalledApplicationLosesItsRowsAtItsNextCheck) {
  database.addApplicationWithBundleIdentifier(app, true);
  database.addControlApplicationWithBundleIdentifier(app, true);
  const test::StandardErrorCapture log;
  bool enabled = false;
  EXPECT_FALSE(manager.applicationWithBundleIdentifierHasAccess(app, enabled));
  EXPECT_FALSE(enabled);
  EXPECT_THAT(database.bundleIdentifiersAccessingExternalCameras(), IsEmpty());
  EXPECT_THAT(database.bundleIdentifiersControllingExternalCameras(), ElementsAre(app))
      << "each kind by itself";
  EXPECT_FALSE(manager.controlApplicationWithBundleIdentifierHasAccess(app));
  EXPECT_THAT(database.bundleIdentifiersControllingExternalCameras(), IsEmpty());
  EXPECT_THAT(log.text(),
              HasSubstr("ovaccess ! Bundle was not found to be installed on the device, revoking access "
                        "defensively to require the user to re-authorize upon install.\n"));
  EXPECT_THAT(log.text(), HasSubstr("Revoking Application BundleID org.example.App"));
  EXPECT_THAT(log.text(), HasSubstr("Revoking Control BundleID org.example.App"));
}

TEST_F(DeviceAccessManagerTest, AnIdentifierThatContainsTheVendorPrefixKeepsItsRows) {
  for (const char* vendors : {"org.orvid.Tool", "com.example.org.orvid.x"}) {
    database.addApplicationWithBundleIdentifier(vendors, true);
    bool enabled = false;
    EXPECT_TRUE(manager.applicationWithBundleIdentifierHasAccess(vendors, enabled)) << vendors;
    EXPECT_TRUE(enabled) << vendors;
  }
}

TEST_F(DeviceAccessManagerTest, AnInstalledApplicationWithoutARowIsNotValidEither) {
  applications.installed = {app};
  EXPECT_FALSE(manager.validateBundleIdentifierInstalled(app, false));
  database.addApplicationWithBundleIdentifier(app, true);
  EXPECT_TRUE(manager.validateBundleIdentifierInstalled(app, false));
  EXPECT_FALSE(manager.validateBundleIdentifierInstalled(app, true));
}

TEST_F(DeviceAccessManagerTest, AGrantThatIsStoredWhileOneIsLookedForStays) {
  applications.installed = {app};
  applications.meanwhile = [&] { database.addApplicationWithBundleIdentifier(app, true); };
  EXPECT_FALSE(manager.validateBundleIdentifierInstalled(app, false));
  EXPECT_THAT(database.bundleIdentifiersAccessingExternalCameras(), ElementsAre(app));
  applications.meanwhile = [&] { database.addControlApplicationWithBundleIdentifier(app, true); };
  EXPECT_FALSE(manager.validateBundleIdentifierInstalled(app, true));
  EXPECT_THAT(database.bundleIdentifiersControllingExternalCameras(), ElementsAre(app));
}

TEST_F(DeviceAccessManagerTest, AGrantThatCannotBeReadForAWhileStays) {
  applications.installed = {app};
  database.addApplicationWithBundleIdentifier(app, true);
  auto other = *Database::open(home / "data/externalMediaAccess.db");
  ASSERT_EQ(other->execute("BEGIN EXCLUSIVE"), std::nullopt);
  applications.meanwhile = [&] { EXPECT_EQ(other->execute("ROLLBACK"), std::nullopt); };
  EXPECT_FALSE(manager.validateBundleIdentifierInstalled(app, false)) << "nobody knows";
  EXPECT_THAT(database.bundleIdentifiersAccessingExternalCameras(), ElementsAre(app));
}

TEST_F(DeviceAccessManagerTest, WithoutAGrantAndWithoutAnAlertAccessIsRefused) {
  EXPECT_FALSE(manager.validateBundleIdentifier(app, nullptr));
  EXPECT_EQ(alerts.shown, 0);
}

TEST_F(DeviceAccessManagerTest, TheDefaultButtonGrantsAndIsRecorded) {
  applications.installed = {app};
  EXPECT_TRUE(manager.validateBundleIdentifier(app, &alert));
  EXPECT_EQ(*alerts.last.string("title"), "May it?");
  EXPECT_TRUE(manager.validateBundleIdentifier(app, &alert));
  EXPECT_EQ(alerts.shown, 1) << "the second time it is known";
}

TEST_F(DeviceAccessManagerTest, AnyOtherButtonStoresNothingForAccess) {
  applications.installed = {app};
  for (const auto response : {UserAlert::alternateButton, UserAlert::otherButton, UserAlert::dismissed}) {
    alerts.response = response;
    EXPECT_FALSE(manager.validateBundleIdentifier(app, &alert));
  }
  EXPECT_EQ(alerts.shown, 3) << "the next request asks again";
  EXPECT_THAT(database.bundleIdentifiersAccessingExternalCameras(), IsEmpty());
}

TEST_F(DeviceAccessManagerTest, ForControlAGrantIsStoredEvenAfterARefusal) {
  applications.installed = {app};
  alerts.response = UserAlert::alternateButton;
  EXPECT_FALSE(manager.validateControlApplicationBundleIdentifier(app, &alert));
  EXPECT_EQ(database.rowsOf(app, AccessDatabase::Table::control)[0].signedInteger("whitelisted"), 0);
  EXPECT_TRUE(manager.validateControlApplicationBundleIdentifier(app, &alert));
  EXPECT_EQ(alerts.shown, 1) << "the next check succeeds without asking";
}

TEST_F(DeviceAccessManagerTest, ControlIsGivenWithoutAnAlert) {
  applications.installed = {app};
  EXPECT_TRUE(manager.validateControlApplicationBundleIdentifier(app, nullptr));
  EXPECT_THAT(database.bundleIdentifiersControllingExternalCameras(), ElementsAre(app));
}

TEST_F(DeviceAccessManagerTest, TheCompletionHearsWhichButtonWasPressed) {
  for (const auto response :
       {UserAlert::defaultButton, UserAlert::alternateButton, UserAlert::otherButton, UserAlert::dismissed}) {
    alerts.response = response;
    std::vector<std::pair<bool, int>> heard;
    manager.displayAlertForApplication(app, alert,
                                       [&](bool handled, int code) { heard.emplace_back(handled, code); });
    EXPECT_THAT(heard, ElementsAre(std::pair(true, static_cast<int>(response))));
  }
}

TEST_F(DeviceAccessManagerTest, AnAlertThatCannotBeShownIsNotCompleted) {
  OVDeviceAccessManager alone(database, applications, nullptr);
  bool completed = false;
  alone.displayAlertForApplication(app, alert, [&](bool, int) { completed = true; });
  EXPECT_FALSE(completed);
}

/// What a thread needs that outlives its test.
struct Stuck {
  explicit Stuck(const std::string& folder) : database(pool, folder) {}

  Pool pool;
  AccessDatabase database;
  Applications applications;
  OVDeviceAccessManager manager{database, applications, nullptr};
  const Dictionary alert{{"title", "May it?"}};
  std::atomic<pid_t> asking = 0;
  std::atomic<bool> answered = false;
};

TEST(UnansweredTest, WhoAsksWhereNobodyCanBeAskedKeepsWaiting) {
  const test::TemporaryFolder home;
  const test::StandardErrorCapture log;
  auto* stuck = new Stuck(home / "data");  // for as long as the process lives, as is its thread
  std::thread([stuck] {
    stuck->asking = ::gettid();
    (void)stuck->manager.validateBundleIdentifier("org.example.App", &stuck->alert);
    stuck->answered = true;
  }).detach();
  EXPECT_TRUE(test::waitUntil(
      [&] { return log.text().find("nobody can be asked about org.example.App") != std::string::npos; }));
  EXPECT_TRUE(test::waitUntil([&] { return test::isBlocked(stuck->asking); }));
  EXPECT_FALSE(stuck->answered);
  EXPECT_THAT(stuck->database.bundleIdentifiersAccessingExternalCameras(), IsEmpty());
}

}  // namespace
}  // namespace brivo
