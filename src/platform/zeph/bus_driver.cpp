// SPDX-License-Identifier: MIT
#include "platform/zeph/bus_driver.h"

#include <systemd/sd-bus.h>

#include <cstring>

namespace brivo::zeph {

namespace {

constexpr const char* kDriver = "org.freedesktop.DBus";
/// Every client is alone on its connection, so one name does for all.
constexpr const char* kClientName = ":1.1";

int sendFromDriver(sd_bus_message* answer) {
  const int result = sd_bus_message_set_sender(answer, kDriver);
  return result < 0 ? result : sd_bus_send(nullptr, answer, nullptr);
}

/// Answers `call` with arguments of `types` as sd_bus_message_append() takes them.
template <class... Values>
int answer(sd_bus_message* call, const char* types, Values... values) {
  sd_bus_message* message = nullptr;
  int result = sd_bus_message_new_method_return(call, &message);
  if (result >= 0 && *types) result = sd_bus_message_append(message, types, values...);
  if (result >= 0) result = sendFromDriver(message);
  sd_bus_message_unref(message);
  return result;
}

bool isServiceName(const char* name) { return std::strcmp(name, kServiceName) == 0; }
bool isKnown(const char* name) {
  return isServiceName(name) || std::strcmp(name, kDriver) == 0 || std::strcmp(name, kClientName) == 0;
}

int hello(sd_bus_message* call, void*, sd_bus_error*) { return answer(call, "s", kClientName); }

int matchRule(sd_bus_message* call, void*, sd_bus_error*) { return answer(call, ""); }

int nameHasOwner(sd_bus_message* call, void*, sd_bus_error*) {
  const char* name = nullptr;
  const int result = sd_bus_message_read(call, "s", &name);
  return result < 0 ? result : answer(call, "b", isKnown(name) ? 1 : 0);
}

int getNameOwner(sd_bus_message* call, void*, sd_bus_error* error) {
  const char* name = nullptr;
  const int result = sd_bus_message_read(call, "s", &name);
  if (result < 0) return result;
  if (isKnown(name)) return answer(call, "s", name);
  return sd_bus_error_setf(error, SD_BUS_ERROR_NAME_HAS_NO_OWNER, "Nobody has the name '%s'", name);
}

int listNames(sd_bus_message* call, void*, sd_bus_error*) {
  return answer(call, "as", 3, kDriver, kServiceName, kClientName);
}

const sd_bus_vtable kDriverTable[] = {
    SD_BUS_VTABLE_START(0),
    SD_BUS_METHOD_WITH_NAMES("Hello", "", "", "s", "name\0", hello, SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_METHOD_WITH_NAMES("AddMatch", "s", "rule\0", "", "", matchRule, SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_METHOD_WITH_NAMES("RemoveMatch", "s", "rule\0", "", "", matchRule, SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_METHOD_WITH_NAMES("GetNameOwner", "s", "name\0", "s", "owner\0", getNameOwner,
                             SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_METHOD_WITH_NAMES("NameHasOwner", "s", "name\0", "b", "owned\0", nameHasOwner,
                             SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_METHOD_WITH_NAMES("ListNames", "", "", "as", "names\0", listNames, SD_BUS_VTABLE_UNPRIVILEGED),
    SD_BUS_VTABLE_END};

}  // namespace

int addBusDriver(sd_bus* bus) {
  return sd_bus_add_object_vtable(bus, nullptr, "/org/freedesktop/DBus", kDriver, kDriverTable, nullptr);
}

}  // namespace brivo::zeph
