// SPDX-License-Identifier: MIT
#pragma once

#include "platform/base/result.h"

namespace brivo::imaging {

/// Takes from the calling thread, and those it will start, every right that Landlock knows (landlock(7)): to
/// open, make or change files, TCP, and signals to others. Descriptors that are open, or are sent, stay
/// usable. Needs PR_SET_NO_NEW_PRIVS. Gives the version of Landlock's interface, 0 where the kernel has none.
Result<int> giveUpFileSystem();

}  // namespace brivo::imaging
