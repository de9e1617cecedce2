// SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace brivo::bench {

/// What the command line of a benchmark asks for.
struct Options {
  /// Small cards and few repetitions, to try the program out.
  bool quick = false;
  /// A card with pictures that make_card.py has made, on the file system on which cards are made; empty when
  /// it is to be made.
  std::string card;

  /// Reads "[--quick] [--folder FOLDER] [--card FOLDER]"; prints the usage and ends the program for anything
  /// else. Cards and everything else are made in FOLDER, by default in $TMPDIR, else in /var/tmp.
  static Options fromCommandLine(int count, char** words);

  /// `full`, or `small` when the run is a quick one.
  template <class T>
  T pick(T full, T small) const {
    return quick ? small : full;
  }
};

/// The whole of a benchmark program: reads the command line, prints the headings and has `measure` print its
/// figures. Gives what main() returns.
int runBenchmark(int count, char** words, void (*measure)(const Options&));

}  // namespace brivo::bench
