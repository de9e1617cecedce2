// SPDX-License-Identifier: MIT
// Lists the pictures on every camera card, and saves the first one.
//
//   c++ list_cards.cpp -o list_cards $(pkg-config --cflags --libs orvidcore)
//
// The program must have been let in: brivoctl access grant "$PWD/list_cards"
#include <orvidcore/orvidcore.h>

#include <algorithm>
#include <iostream>

int main() {
  const auto browser = orvid::DeviceBrowser::connect();
  if (!browser.ok()) {
    std::cerr << browser.error().text << "\n";
    return 1;
  }
  const auto devices = (*browser)->devices();
  if (!devices.ok()) return 1;
  for (const orvid::DeviceInfo& info : *devices) {
    std::cout << info.name << "\n";
    const auto device = (*browser)->open(info);
    if (!device.ok()) continue;
    const auto objects = (*device)->catalogue();
    if (!objects.ok()) {
      std::cerr << objects.error().text << "\n";
      return 1;
    }
    for (const orvid::Object& object : *objects) {
      if (!object.info().isFolder)
        std::cout << "  " << object.info().path << "  " << object.info().size << "\n";
    }
    const auto first =
        std::ranges::find_if(*objects, [](const auto& object) { return !object.info().isFolder; });
    if (first == objects->end()) continue;
    const auto saved = first->save(first->info().name);
    std::cout << (saved.ok() ? "saved " : "not saved ") << first->info().name << "\n";
  }
  return 0;
}
