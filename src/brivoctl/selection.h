// SPDX-License-Identifier: MIT
// Which device and which objects the arguments mean.
#pragma once

#include <memory>
#include <string>
#include <variant>
#include <vector>

#include "brivoctl/command.h"

namespace brivoctl {

/// What a selection comes to: the choice, or the exit code after the reason was said.
template <class T>
using Selected = std::variant<T, ExitCode>;

/// The device that `selector` means among `devices`; of several a usage error, of none a failure. An empty
/// selector means the only one.
Selected<orvid::DeviceInfo> chooseDevice(const std::vector<orvid::DeviceInfo>& devices,
                                         const std::string& selector);

/// A connected browser with one device open on it.
struct OpenDevice {
  std::shared_ptr<orvid::DeviceBrowser> browser;
  std::shared_ptr<orvid::Device> device;
};

/// Connects and opens the device that `selector` means.
Selected<OpenDevice> openDevice(const CommonOptions& common, const std::string& selector);

/// Connects and splits "[DEVICE] OBJECT...": the first argument is the device when it means one.
struct DeviceAndObjects {
  OpenDevice open;
  std::vector<orvid::Object> objects;
};
Selected<DeviceAndObjects> openObjects(const CommonOptions& common,
                                       const std::vector<std::string>& arguments);

}  // namespace brivoctl
