// SPDX-License-Identifier: MIT
#include "platform/zeph/bus_vtable.h"

#include <algorithm>
#include <list>
#include <string>
#include <vector>

namespace brivo::zeph {

namespace {

struct Table {
  const Protocol* protocol = nullptr;
  std::vector<sd_bus_vtable> rows;
  std::list<std::string> strings;  // what the rows point to
};

sd_bus_vtable row(Table& table, const Member& member, sd_bus_message_handler_t onMethod) {
  const char* name = table.strings.emplace_back(member.dbusName()).c_str();
  std::string& names = table.strings.emplace_back(member.names);
  std::ranges::replace(names, ',', '\0');
  if (member.kind == Member::Kind::signal) {
    return SD_BUS_SIGNAL_WITH_NAMES(name, member.in, names.c_str(), 0);
  }
  sd_bus_vtable method = SD_BUS_METHOD(name, member.in, member.out, onMethod, SD_BUS_VTABLE_UNPRIVILEGED);
  method.x.method.names = names.c_str();
  return method;
}

}  // namespace

const sd_bus_vtable* vtableOf(const Protocol& protocol, sd_bus_message_handler_t onMethod) {
  static std::list<Table> tables;
  for (const Table& table : tables) {
    if (table.protocol == &protocol) return table.rows.data();
  }
  Table& table = tables.emplace_back();
  table.protocol = &protocol;
  table.rows.push_back(SD_BUS_VTABLE_START(0));
  for (const Member& member : protocol.members) table.rows.push_back(row(table, member, onMethod));
  table.rows.push_back(SD_BUS_VTABLE_END);
  return table.rows.data();
}

}  // namespace brivo::zeph
