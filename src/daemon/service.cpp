// SPDX-License-Identifier: MIT
#include "daemon/service.h"

#include "platform/base/paths.h"
#include "platform/decoding/worker_program.h"
#include "platform/preferences/preferences_store.h"
#include "platform/settings/folders.h"
#include "protocol/protocols.h"
#include "util/log.h"

namespace brivo {

namespace {

constexpr std::chrono::seconds kDefaultIdleTime{60};
/// A service that is activated may be the next one of one that is still ending.
constexpr std::chrono::seconds kPatienceWithLast{10};
/// A process that a killed service was just starting may hold its lock until it executes its program.
constexpr std::chrono::milliseconds kPatienceWithKilled{250};
constexpr const char* kDataFolder = "org.orvid.imagecapture";
constexpr const char* kMatchingList = "OrvidCore/DeviceMatchingInfo.plist";

/// The folder of the access database. The user's data folder above it is made when it is missing.
std::string dataFolder(const Settings& settings) {
  if (const auto error = makeBaseDirectory(settings.dataHome)) OVLogError("ovaccess", "{}", error->text());
  return appendingPathComponent(settings.dataHome, kDataFolder);
}

/// A card full of movies leaves a worker to those who want to see something.
std::size_t movieLoads() { return WorkerOptions::defaultWorkerCount() - 1; }

}  // namespace

Service::Service(RunLoop& mainLoop, Settings settings, std::unique_ptr<zeph::RuntimeFolder> folder)
    : mainLoop_(mainLoop),
      settings_(std::move(settings)),
      folder_(std::move(folder)),
      applications_(settings_.dataHome, settings_.dataDirs, std::string(kVendorPrefix)),
      power_(mainLoop_, [](const std::string& line) { OVLogError("power", "{}", line); }),
      workers_({.program = installedWorkerProgram(),
                .log = [](std::string_view line) { OVLog("imaging", "{}", line); }}),
      movies_(movieReader_, movieLoads(), WorkerOptions::defaultWorkerCount()),
      database_(pool_, dataFolder(settings_)),
      connections_(pool_, [](const std::string& line) { OVLogError("zeph", "{}", line); }),
      volumes_(pool_, settings_.volumeRoots, settings_.volumeFolders),
      manager_(std::make_shared<MSRemoteCameraDeviceManager>(mainLoop_, volumes_, transactions_,
                                                             deviceServices())) {}

Result<std::unique_ptr<Service>> Service::start(RunLoop& mainLoop) {
  OVLog("brivo[zeph]", "{}", "Launching brivo [zeph]");
  Settings settings = Settings::fromEnvironment();
  auto folder = zeph::RuntimeFolder::claim(settings.runtimeDir,
                                           settings.startedByBus ? kPatienceWithLast : kPatienceWithKilled);
  if (!folder.ok()) return folder.error();
  std::unique_ptr<Service> service(new Service(mainLoop, std::move(settings), *std::move(folder)));
  service->manager_->startMSDeviceNotifications();  // without it the registry stays empty, nothing more
  if (const auto error = service->listen()) return *error;
  service->openFrontDoor();
  LaunchService::ready();
  return service;
}

Service::~Service() {
  launchService_.stopping();
  idleExit_.reset();
  if (listener_) listener_->invalidate();
  manager_->stop();
  manager_.reset();
  pool_.waitUntilIdle();  // the last share of a device may be a task's, and devices need what goes next
}

std::optional<SystemError> Service::listen() {
  auto listener = connections_.namedListener(*folder_, "manager");
  if (!listener.ok()) return listener.error();
  listener_ = *std::move(listener);
  listener_->setDelegate(manager_);
  listener_->resume();
  if (connections_.startedByActivation() || settings_.startedByBus) exitWhenIdle();
  return std::nullopt;
}

void Service::openFrontDoor() {
  frontDoor_ = std::make_shared<FrontDoor>(mainLoop_, listener_, manager_);
  connections_.openDoor({FrontDoor::kName, frontDoorProtocol(), FrontDoor::kLongestHandle,
                         FrontDoor::unknownDevice(), frontDoor_,
                         [](const std::string& line) { OVLog("frontDoor", "{}", line); }});
}

void Service::exitWhenIdle() {
  idleExit_ =
      std::make_unique<IdleExit>(mainLoop_, transactions_, settings_.idleTime.value_or(kDefaultIdleTime),
                                 [this](const std::function<void(bool)>& answer) { leaveIfIdle(answer); });
}

void Service::leaveIfIdle(const std::function<void(bool idle)>& answer) {
  connections_.stopAcceptingIfIdle([this, answer](bool idle) {
    if (!idle) return answer(false);
    mainLoop_.post([this, answer] { leaveFrontDoor(answer); });
  });
}

/// The launch service first: a call to a name that nobody has makes it start the service, which would do
/// nothing as long as it takes this process for one that stays.
void Service::leaveFrontDoor(const std::function<void(bool idle)>& answer) {
  launchService_.stopping();
  connections_.closeDoorIfIdle([this, answer](bool idle) {
    if (!idle) mainLoop_.post([this] { launchService_.notYet(); });
    answer(idle);
  });
}

DeviceServices Service::deviceServices() {
  return {pool_,
          systemFiles(),
          images_,
          movies_,
          power_,
          &access_,
          [this]() -> std::shared_ptr<zeph::Listener> {
            auto listener = connections_.anonymousListener(*folder_);
            if (listener.ok()) return *std::move(listener);
            OVLogError("brivodevice", "{}", listener.error().text());
            return nullptr;
          },
          [this](const AuditToken& token) { return identity_.codeSigningIdentifier(token); },
          [this] { return readPropertyListFile(settings_.findDataFile(kMatchingList)); },
          volumeStatistics};
}

}  // namespace brivo
