// SPDX-License-Identifier: MIT
// What a decoder that was taken over would try.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace brivo::test {

/// The names of all attempts.
std::vector<std::string_view> probeNames();
/// Tries one, with `file` an open file: "done", or the name of the error.
std::string probe(std::string_view name, int file);

}  // namespace brivo::test
