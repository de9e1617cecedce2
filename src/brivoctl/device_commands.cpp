// SPDX-License-Identifier: MIT
// devices, watch
#include <fmt/core.h>

#include <atomic>
#include <csignal>
#include <cstdio>
#include <mutex>

#include "brivoctl/command.h"
#include "brivoctl/output.h"
#include "platform/work/run_loop.h"

namespace brivoctl {

namespace {

ExitCode listDevices(const CommonOptions& common) {
  const auto browser = orvid::DeviceBrowser::connect(common.address, common.wait());
  if (!browser.ok()) return report(browser.error());
  const auto devices = (*browser)->devices(common.wait());
  if (!devices.ok()) return report(devices.error());
  if (common.json) {
    Json list = Json::array();
    for (const auto& device : *devices) list.push_back(jsonOf(device));
    printJson(list);
    return kSuccess;
  }
  if (devices->empty()) std::fputs("no camera devices\n", stderr);
  for (const auto& device : *devices) {
    printLine(fmt::format("{}  {:<20}  {}", device.uuid, shown(device.name), shown(device.mountPath)));
  }
  return kSuccess;
}

/// Prints what happens until it is told to stop.
class Watch {
 public:
  Watch(const CommonOptions& common, bool devicesOnly) : common_(common), devicesOnly_(devicesOnly) {}

  ExitCode run() {
    loop_.onSignals({SIGINT, SIGTERM}, [this] { loop_.quit(); });
    auto browser = orvid::DeviceBrowser::connect(common_.address, common_.wait());
    if (!browser.ok()) return report(browser.error());
    browser_ = *std::move(browser);
    browser_->setEvents({[this](const orvid::DeviceInfo& device) { added(device); },
                         [this](const orvid::DeviceInfo& device) { say("removed", jsonOf(device)); },
                         [this] {
                           serviceGone_ = true;
                           loop_.quit();
                         }});
    const auto devices = browser_->devices(common_.wait());
    if (!devices.ok()) return report(devices.error());
    for (const auto& device : *devices) added(device);
    loop_.run();
    return serviceGone_ ? fail("the service has gone", kNoService) : kSuccess;
  }

 private:
  void added(const orvid::DeviceInfo& device) {
    say("added", jsonOf(device));
    if (!devicesOnly_) follow(device);
  }

  void follow(const orvid::DeviceInfo& info) {
    const auto opened = browser_->open(info, common_.wait());
    if (!opened.ok()) return (void)report(opened.error());
    const auto& device = *opened;
    const std::string uuid = info.uuid;
    orvid::DeviceEvents events;
    events.onReady = [this, uuid](std::int32_t count) { say("ready", {{"device", uuid}, {"count", count}}); };
    events.onItems = [this, uuid](const std::vector<orvid::ObjectInfo>& items) {
      Json list = Json::array();
      for (const auto& item : items) list.push_back(jsonOf(item));
      say("items", {{"device", uuid}, {"items", std::move(list)}});
    };
    events.onPercent = [this, uuid](std::uint32_t percent) {
      say("percent", {{"device", uuid}, {"percent", percent}});
    };
    events.onProgress = [this, uuid](std::uint32_t handle, std::uint64_t bytes, double percent) {
      say("progress", {{"device", uuid}, {"handle", handle}, {"bytes", bytes}, {"percent", percent}});
    };
    device->setEvents(std::move(events));
    device->startAsync(
        [device, wait = common_.wait()](const orvid::Result<orvid::Dictionary>& started) {
          if (!started.ok()) return (void)report(started.error());
          device->enumerateAsync(
              {},
              [](const orvid::Result<orvid::Done>& begun) {
                if (!begun.ok()) report(begun.error());
              },
              wait);
        },
        common_.wait());
  }

  void say(const char* event, const Json& details) {
    const std::lock_guard lock(mutex_);
    if (common_.json) {
      Json line = {{"event", event}};
      line.update(details);
      printJsonLine(line);
    } else {
      printLine(fmt::format("{:<8} {}", event, summary(event, details)));
    }
    if (outputFailed()) loop_.quit();
  }

  static std::string summary(const std::string& event, const Json& details) {
    if (event == "added" || event == "removed") {
      return details["handle"].get<std::string>() + "  " + shown(details["path"].get<std::string>());
    }
    if (event == "ready") return fmt::format("{} objects", details["count"].get<int>());
    if (event == "percent") return fmt::format("{} %", details["percent"].get<unsigned>());
    if (event == "progress") {
      return fmt::format("object {}: {}", details["handle"].get<unsigned>(),
                         shownSize(details["bytes"].get<std::uint64_t>()));
    }
    std::string paths;
    for (const Json& item : details["items"]) paths += shown(item["path"].get<std::string>()) + "  ";
    return paths;
  }

  const CommonOptions& common_;
  const bool devicesOnly_;
  std::mutex mutex_;
  std::atomic<bool> serviceGone_ = false;
  brivo::RunLoop loop_;
  /// Last, because it ends first: its events use the others.
  std::shared_ptr<orvid::DeviceBrowser> browser_;
};

}  // namespace

void addDeviceCommands(CLI::App& app, CommonOptions& common, ExitCode& exitCode) {
  CLI::App* devices = addServiceCommand(app, common, "devices", "List the camera devices");
  devices->callback([&] { exitCode = listDevices(common); });

  CLI::App* watch = addServiceCommand(app, common, "watch",
                                      "Print devices and objects as they come and go, until interrupted");
  const auto devicesOnly = std::make_shared<bool>(false);
  watch->add_flag("--devices-only", *devicesOnly, "Open no device");
  watch->callback([&common, &exitCode, devicesOnly] { exitCode = Watch(common, *devicesOnly).run(); });
}

}  // namespace brivoctl
