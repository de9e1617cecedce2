// SPDX-License-Identifier: MIT
#include "platform/zeph/bus_credentials.h"

#include <systemd/sd-bus.h>

#include <limits>
#include <string_view>

namespace brivo::zeph {

namespace {

/// Reads the value of one entry, or skips it when nobody asked for it.
int readEntry(sd_bus_message* answer, std::string_view key, std::optional<std::uint32_t>& user,
              std::optional<std::uint32_t>& process, UniqueFd& pidfd) {
  std::uint32_t number = 0;
  if (key == "UnixUserID" || key == "ProcessID") {
    const int result = sd_bus_message_read(answer, "v", "u", &number);
    (key == "UnixUserID" ? user : process) = number;
    return result;
  }
  if (key != "ProcessFD") return sd_bus_message_skip(answer, "v");
  int fd = -1;
  const int result = sd_bus_message_read(answer, "v", "h", &fd);
  if (result < 0) return result;
  UniqueFd borrowed(fd);
  pidfd = borrowed.duplicate();
  (void)borrowed.release();
  return result;
}

}  // namespace

std::optional<BusCredentials> readCredentials(sd_bus_message* answer) {
  std::optional<std::uint32_t> user;
  std::optional<std::uint32_t> process;
  BusCredentials credentials;
  if (sd_bus_message_enter_container(answer, 'a', "{sv}") < 0) return std::nullopt;
  while (sd_bus_message_enter_container(answer, 'e', "sv") > 0) {
    const char* key = nullptr;
    if (sd_bus_message_read(answer, "s", &key) < 0 ||
        readEntry(answer, key, user, process, credentials.pidfd) < 0 ||
        sd_bus_message_exit_container(answer) < 0) {
      return std::nullopt;
    }
  }
  if (!user || !process || *process == 0 || *process > std::numeric_limits<std::int32_t>::max()) {
    return std::nullopt;
  }
  credentials.ids.uid = *user;
  credentials.ids.pid = static_cast<std::int32_t>(*process);
  return credentials;
}

}  // namespace brivo::zeph
