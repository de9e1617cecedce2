// SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace brivo {

/// Path of the decoding worker's program: beside the running program, as in a build tree, else where it was
/// installed together with it, else where this build installs it.
std::string installedWorkerProgram();

}  // namespace brivo
