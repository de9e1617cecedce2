// SPDX-License-Identifier: MIT
#pragma once

#include <functional>
#include <memory>
#include <string>

#include "access/device_access_manager.h"
#include "platform/base/value.h"
#include "platform/decoding/image_decoder.h"
#include "platform/files/file_system.h"
#include "platform/identity/audit_token.h"
#include "platform/movies/movie_service.h"
#include "platform/power/power_assertions.h"
#include "platform/volumes/volume_statistics.h"
#include "platform/work/pool.h"
#include "platform/zeph/listener.h"

namespace brivo {

/// What a device needs from the process that it lives in. Everything referred to outlives every device.
struct DeviceServices {
  Pool& pool;
  FileSystem& files;
  ImageDecoder& images;
  MovieService& movies;
  PowerAssertions& power;
  /// Null when nobody can decide; then every client is refused.
  OVDeviceAccessManager* access;
  /// A fresh anonymous listener; null when there are no sockets to be had.
  std::function<std::shared_ptr<zeph::Listener>()> makeListener;
  /// Who a peer is; none when that cannot be told.
  std::function<std::optional<std::string>(const AuditToken&)> codeSigningIdentifier;
  /// The device matching list; none when it is missing or unreadable.
  std::function<std::optional<Dictionary>()> deviceMatchingInfo;
  std::function<VolumeStatistics(const std::string& path)> volumeStatistics;
};

}  // namespace brivo
