// SPDX-License-Identifier: MIT
#pragma once

#include <optional>

#include "platform/base/unique_fd.h"
#include "platform/identity/audit_token.h"

struct sd_bus_message;

namespace brivo::zeph {

/// Who is behind a name on a message bus, as the bus says.
struct BusCredentials {
  AuditToken::Credentials ids;
  /// Of the process; none from a bus that does not hand it out.
  UniqueFd pidfd;
};

/// What an answer of GetConnectionCredentials says (D-Bus Specification, "Message Bus Messages"). None when
/// it lacks the user or the process. I/O thread.
std::optional<BusCredentials> readCredentials(sd_bus_message* answer);

}  // namespace brivo::zeph
