// SPDX-License-Identifier: MIT
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "platform/base/value.h"
#include "platform/files/file_system.h"

namespace brivo {

/// True when at least one of the folders that the matching list names for this service lies directly under
/// `volumePath`. `mediaPaths`, when given, receives the names of those that do, as listed and in list order.
/// What is missing is logged and makes it false. Blocks as long as the medium does. *Thread-safe.*
///
/// The matching list is a dictionary with "cameraClasses", an array of dictionaries; the first with the
/// "class" "BrivoDeviceManager" counts. Its "volumeInfo" is the array of folder names; "DCIM" alone when it
/// has none or when no such class is listed.
bool IsSupportedMassStorageCameraVolume(const std::optional<std::string>& volumePath,
                                        std::vector<std::string>* mediaPaths,
                                        const std::optional<Dictionary>& matchingList, FileSystem& files);

}  // namespace brivo
