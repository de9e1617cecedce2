// SPDX-License-Identifier: MIT
// The system calls of a catalogue and nothing else, in one thread: what the service's figures are compared
// with.
#pragma once

#include <cstddef>
#include <functional>
#include <string>

namespace brivo::bench {

// What the service asks the kernel for one catalogue, as strace(1) shows it; the two functions do the same.
//
// First it counts. DCIM and each folder in it: openat2 (no symbolic links), fstat, two fcntl, getdents64
// until nothing is left, close.
//
// Then it walks. DCIM itself: openat2 (O_PATH), statx, faccessat2, close. DCIM and each folder in it: listed
// as before, and for each entry one statx (type, mode, size, modification and creation time) and one
// faccessat2 (writable).

/// Counts; the number of names below the folders in DCIM. Throws when something cannot be listed.
std::size_t countNames(const std::string& card);
/// Walks, and calls `eachFile` after it has got the values of one; the number of files whose values could be
/// had. Throws when something cannot be listed.
std::size_t walkWithValues(
    const std::string& card, const std::function<void()>& eachFile = [] {});

/// Lists as above, and asks each file for the same values, opens it, reads its first 64 KiB and closes it:
/// the least that telling what is in pictures can take without knowing where in them it is. The number of
/// files that could be read. Throws when something cannot be listed.
std::size_t readHeads(const std::string& card);

}  // namespace brivo::bench
