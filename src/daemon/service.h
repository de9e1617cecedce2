// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <optional>
#include <string>

#include "access/access_database.h"
#include "access/device_access_manager.h"
#include "daemon/device_manager.h"
#include "daemon/front_door.h"
#include "platform/applications/desktop_catalogue.h"
#include "platform/decoding/imaging_service.h"
#include "platform/identity/task_identity.h"
#include "platform/keepalive/idle_exit.h"
#include "platform/keepalive/launch_service.h"
#include "platform/movies/movie_service.h"
#include "platform/movies/worker_movie_reader.h"
#include "platform/power/logind_inhibitors.h"
#include "platform/settings/settings.h"
#include "platform/volumes/volume_monitor.h"
#include "platform/zeph/connection_service.h"

namespace brivo {

/// Everything that the process runs, put together. *Thread-bound* to the main thread.
class Service {
 public:
  /// Starts the service on `mainLoop`. An error when it cannot be reached: no runtime folder, another
  /// service, no socket.
  static Result<std::unique_ptr<Service>> start(RunLoop& mainLoop);
  /// Ends what was started, in the reverse order. May wait for a medium.
  ~Service();
  Service(const Service&) = delete;
  Service& operator=(const Service&) = delete;

 private:
  Service(RunLoop& mainLoop, Settings settings, std::unique_ptr<zeph::RuntimeFolder> folder);
  std::optional<SystemError> listen();
  DeviceServices deviceServices();
  void openFrontDoor();
  void exitWhenIdle();
  /// Ends what brings new clients, unless one is there or comes meanwhile; `answer` hears whether nobody did.
  void leaveIfIdle(const std::function<void(bool idle)>& answer);
  void leaveFrontDoor(const std::function<void(bool idle)>& answer);

  RunLoop& mainLoop_;
  LaunchService launchService_{mainLoop_};
  const Settings settings_;
  const std::unique_ptr<zeph::RuntimeFolder> folder_;

  // In the order in which each needs the ones before it.
  Pool pool_;
  DesktopCatalogue applications_;
  TaskIdentity identity_{applications_};
  LogindInhibitors power_;
  WorkerPool workers_;
  ImagingService images_{workers_};
  WorkerMovieReader movieReader_{workers_};
  MovieService movies_;
  AccessDatabase database_;
  OVDeviceAccessManager access_{database_, applications_, nullptr};  // without alerts: devices never ask
  Transactions transactions_;
  zeph::ConnectionService connections_;
  VolumeMonitor volumes_;
  std::shared_ptr<MSRemoteCameraDeviceManager> manager_;
  std::shared_ptr<zeph::Listener> listener_;
  std::shared_ptr<FrontDoor> frontDoor_;
  std::unique_ptr<IdleExit> idleExit_;
};

}  // namespace brivo
