// SPDX-License-Identifier: MIT
// What the reader says of a file, fact by fact, against what another program says.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "corpus.h"

namespace brivo::images {

/// A fact on which the two are not of one mind, as text; empty where one of them says nothing.
struct Disagreement {
  std::string fact;
  std::string ours;
  std::string theirs;
};

/// The kind of still image that a file is by its bytes: "JPEG", "HEIF" and so on, "OtherRaw"; empty for
/// movies, sounds and what is none.
std::string_view kindOf(const CorpusFile& file);

/// Reads the file in all three ways and compares size, orientation, dates, camera, thumbnail and every
/// embedded JPEG. The bytes where the reader has seen a JPEG must begin one, and the ways must agree with
/// each other.
std::vector<Disagreement> compare(const Corpus& corpus, const CorpusFile& file);

}  // namespace brivo::images
