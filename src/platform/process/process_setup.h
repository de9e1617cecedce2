// SPDX-License-Identifier: MIT
#pragma once

namespace brivo {

/// Makes the process fit for a long life: descriptors 0 to 2 are open, a reader of the log that goes away
/// does not end it, and it may open as many files as its hard limit says. Before the first thread.
void prepareProcess();

}  // namespace brivo
