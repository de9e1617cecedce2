// SPDX-License-Identifier: MIT
#pragma once

#include "platform/base/result.h"

namespace brivo::imaging {

/// What differs from machine to machine; everything else is in force wherever confine() succeeds.
struct Protections {
  int landlockAbi = 0;  ///< 0: the kernel has no Landlock
  bool memoryLimited = false;
};

/// Takes from this process, for good, all that decoding does not need: it keeps its memory, its descriptors
/// and those that it is sent. It gets no others, no threads and no children, it dies when it tries what no
/// decoder would, and it dies with the thread that started it. Before the first thread, and after whatever
/// must open files. On an error the process is not confined and must end.
Result<Protections> confine();

}  // namespace brivo::imaging
