// SPDX-License-Identifier: MIT
#pragma once

#include <functional>

namespace brivo {

/// Work that is handed from one thread to another.
using Task = std::function<void()>;

}  // namespace brivo
