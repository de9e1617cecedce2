// SPDX-License-Identifier: MIT
#pragma once

#include "brivoctl/output.h"
#include "ptp/records.h"

namespace brivoctl {

/// The fields of a record in the order of its bytes, codes with their names; a payload in hexadecimal.
Json jsonOf(const brivo::PTPRecord& record);

}  // namespace brivoctl
