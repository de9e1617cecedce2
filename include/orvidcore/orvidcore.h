// SPDX-License-Identifier: MIT
// The client library of the camera service. Start with DeviceBrowser::connect().
#pragma once

#include "orvidcore/device.h"
#include "orvidcore/device_browser.h"
#include "orvidcore/object.h"
#include "orvidcore/result.h"
