// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "platform/base/result.h"
#include "platform/base/unique_fd.h"

namespace brivo {

/// Starts `program` as ChildKeeper::start() says; the result refers to the process, which the caller reaps.
Result<UniqueFd> spawnWithSocket(const std::string& program, const UniqueFd& socket);

}  // namespace brivo
