// SPDX-License-Identifier: MIT
// Errors of the client library are values.
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <string>

#include "platform/base/data.h"
#include "platform/base/result.h"
#include "platform/base/value.h"

namespace orvid {

using Data = brivo::Data;
using Dictionary = brivo::Dictionary;
using Value = brivo::Value;

enum class ErrorKind {
  noService,     ///< nothing answers at the service's address
  refused,       ///< the access database does not let this application use the device
  disconnected,  ///< the service or the volume has gone
  timedOut,      ///< no answer in time
  request,       ///< the service answered with an error code
  malformed,     ///< the service answered something that the protocol does not know
  file,          ///< a file of this machine could not be written
};

struct Error {
  ErrorKind kind;
  /// The service's "errCode" for ErrorKind::request, else 0.
  std::int32_t code = 0;
  /// One line for people.
  std::string text;
};

/// Either a T or an Error.
template <class T>
using Result = brivo::Result<T, Error>;

/// The value of calls that give nothing back.
struct Done {};

/// Hears the outcome of an asynchronous call, once, on a thread of the library. Blocking calls are allowed
/// there.
template <class T>
using Callback = std::function<void(Result<T>)>;

/// How long a call waits for its answer.
using Timeout = std::chrono::milliseconds;
inline constexpr Timeout kDefaultTimeout{30'000};

}  // namespace orvid
