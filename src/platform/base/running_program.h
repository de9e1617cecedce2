// SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace brivo {

/// The absolute path of the folder that the running program lies in. What is installed with a program is
/// found from there even when the installed tree was moved. *Thread-safe.*
std::string runningProgramFolder();

}  // namespace brivo
