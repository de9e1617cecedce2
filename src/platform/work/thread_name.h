// SPDX-License-Identifier: MIT
#pragma once

namespace brivo {

/// Names the calling thread for debuggers and /proc; at most 15 characters are kept
/// (pthread_setname_np(3)).
void setThreadName(const char* name);

}  // namespace brivo
