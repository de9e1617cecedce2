// SPDX-License-Identifier: MIT
#include "brivoctl/selection.h"

#include <algorithm>
#include <charconv>
#include <optional>

#include "brivoctl/output.h"

namespace brivoctl {

namespace {

std::string upper(std::string text) {
  std::ranges::transform(text, text.begin(),
                         [](unsigned char c) { return static_cast<char>(std::toupper(c)); });
  return text;
}

std::string withoutTrailingSlash(std::string path) {
  while (path.size() > 1 && path.ends_with('/')) path.pop_back();
  return path;
}

/// A handle or path wins over a name, a name over the beginning of a handle.
std::vector<orvid::DeviceInfo> matches(const std::vector<orvid::DeviceInfo>& devices,
                                       const std::string& selector) {
  const auto those = [&](auto test) {
    std::vector<orvid::DeviceInfo> found;
    std::ranges::copy_if(devices, std::back_inserter(found), test);
    return found;
  };
  const std::string handle = upper(selector);
  auto found = those([&](const orvid::DeviceInfo& device) {
    return device.uuid == handle || device.mountPath == withoutTrailingSlash(selector);
  });
  if (found.empty()) found = those([&](const orvid::DeviceInfo& device) { return device.name == selector; });
  if (found.empty() && !selector.empty()) {
    found = those([&](const orvid::DeviceInfo& device) { return device.uuid.starts_with(handle); });
  }
  return found;
}

std::optional<std::uint32_t> handleIn(const std::string& text) {
  std::uint32_t handle = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), handle);
  if (error != std::errc() || end != text.data() + text.size()) return std::nullopt;
  return handle;
}

Selected<std::vector<orvid::DeviceInfo>> connectAndList(const CommonOptions& common, OpenDevice& open) {
  auto browser = orvid::DeviceBrowser::connect(common.address, common.wait());
  if (!browser.ok()) return report(browser.error());
  open.browser = *std::move(browser);
  auto devices = open.browser->devices(common.wait());
  if (!devices.ok()) return report(devices.error());
  return *std::move(devices);
}

std::optional<ExitCode> open(const CommonOptions& common, const orvid::DeviceInfo& info, OpenDevice& open) {
  auto device = open.browser->open(info, common.wait());
  if (!device.ok()) return report(device.error());
  open.device = *std::move(device);
  return std::nullopt;
}

Selected<std::vector<orvid::Object>> findObjects(const CommonOptions& common, const orvid::Device& device,
                                                 const std::vector<std::string>& selectors) {
  const auto catalogue = device.catalogue(common.wait());
  if (!catalogue.ok()) return report(catalogue.error());
  std::vector<orvid::Object> objects;
  for (const std::string& selector : selectors) {
    const auto handle = handleIn(selector);
    const auto found = std::ranges::find_if(*catalogue, [&](const orvid::Object& object) {
      return handle ? object.info().handle == *handle : object.info().path == selector;
    });
    if (found == catalogue->end()) return fail("no such object: " + shown(selector));
    objects.push_back(*found);
  }
  return objects;
}

}  // namespace

Selected<orvid::DeviceInfo> chooseDevice(const std::vector<orvid::DeviceInfo>& devices,
                                         const std::string& selector) {
  const auto found = selector.empty() ? devices : matches(devices, selector);
  if (found.size() == 1) return found.front();
  if (devices.empty()) return fail("there is no device");
  if (found.empty()) return fail("no such device: " + shown(selector));
  std::string text = selector.empty() ? "there are several devices; say which:" : "several devices match:";
  for (const auto& device : found) text += "\n  " + device.uuid + "  " + shown(device.mountPath);
  return fail(text, kUsage);
}

Selected<OpenDevice> openDevice(const CommonOptions& common, const std::string& selector) {
  OpenDevice opened;
  const auto devices = connectAndList(common, opened);
  if (const auto* code = std::get_if<ExitCode>(&devices)) return *code;
  const auto chosen = chooseDevice(std::get<0>(devices), selector);
  if (const auto* code = std::get_if<ExitCode>(&chosen)) return *code;
  if (const auto code = open(common, std::get<0>(chosen), opened)) return *code;
  return opened;
}

Selected<DeviceAndObjects> openObjects(const CommonOptions& common,
                                       const std::vector<std::string>& arguments) {
  DeviceAndObjects selected;
  const auto devices = connectAndList(common, selected.open);
  if (const auto* code = std::get_if<ExitCode>(&devices)) return *code;
  std::vector<std::string> objects = arguments;
  std::string device;
  if (objects.size() > 1 && !matches(std::get<0>(devices), objects.front()).empty()) {
    device = objects.front();
    objects.erase(objects.begin());
  }
  const auto chosen = chooseDevice(std::get<0>(devices), device);
  if (const auto* code = std::get_if<ExitCode>(&chosen)) return *code;
  if (const auto code = open(common, std::get<0>(chosen), selected.open)) return *code;
  auto found = findObjects(common, *selected.open.device, objects);
  if (const auto* code = std::get_if<ExitCode>(&found)) return *code;
  selected.objects = std::get<0>(std::move(found));
  return selected;
}

}  // namespace brivoctl
