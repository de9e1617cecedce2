// SPDX-License-Identifier: MIT
#include "orvidcore/client_test.h"

#include <stdexcept>

namespace orvid::test {

std::string pattern(std::size_t size) {
  std::string bytes(size, '\0');
  for (std::size_t i = 0; i < size; ++i) bytes[i] = static_cast<char>(i * 2654435761u >> 16);
  return bytes;
}

DeviceInfo ClientTest::waitForDevice(const std::string& name) const {
  std::optional<DeviceInfo> found;
  waitUntil([&] {
    const auto devices = browser->devices();
    if (!devices.ok()) return true;
    const auto listed = std::ranges::find(*devices, name, &DeviceInfo::name);
    if (listed != devices->end()) found = *listed;
    return found.has_value();
  });
  if (!found) throw std::runtime_error("no device " + name + "\n" + service.log());
  return *found;
}

std::shared_ptr<Device> ClientTest::open(const std::string& name) const {
  auto opened = browser->open(waitForDevice(name));
  if (!opened.ok()) throw std::runtime_error(opened.error().text);
  return *std::move(opened);
}

std::vector<Object> ClientTest::catalogueOfCard() {
  if (!device) device = open("CARD");
  auto objects = device->catalogue();
  if (!objects.ok()) throw std::runtime_error(objects.error().text);
  return *std::move(objects);
}

Object ClientTest::named(const std::vector<Object>& objects, const std::string& name) {
  const auto found =
      std::ranges::find_if(objects, [&](const Object& object) { return object.info().name == name; });
  if (found == objects.end()) throw std::runtime_error("no object " + name);
  return *found;
}

Object ClientTest::onlyFile(std::string_view content) {
  service.addFile("CARD", "100ABCDE/IMG_0001.JPG", content);
  return named(catalogueOfCard(), "IMG_0001.JPG");
}

}  // namespace orvid::test
