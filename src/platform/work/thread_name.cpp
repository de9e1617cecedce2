// SPDX-License-Identifier: MIT
#include "platform/work/thread_name.h"

#include <sys/prctl.h>

namespace brivo {

void setThreadName(const char* name) { ::prctl(PR_SET_NAME, name); }

}  // namespace brivo
