// SPDX-License-Identifier: MIT
// How fast whole files are read, what a small read takes, and what reading costs in memory.
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <cstdlib>
#include <stdexcept>

#include "command.h"
#include "echo_process.h"
#include "figures.h"
#include "fresh_memory_process.h"
#include "import_figure.h"
#include "memory_figures.h"
#include "object_reader.h"
#include "options.h"
#include "support/raw_dbus.h"
#include "wire_session.h"

namespace brivo::bench {
namespace {

constexpr double kLeastOfBareLoop = 0.9;
constexpr double kLeastOfCopying = 0.8;
constexpr double kLeastOfPeer = 6;
constexpr double kMostRoundTrips = 3;
constexpr std::uint64_t kSmallRead = 4096;
constexpr std::size_t kBareMessage = 64;

/// One large file behind the service and in the page cache.
class LargeFile {
 public:
  explicit LargeFile(std::uint64_t bytes)
      : size_(bytes),
        card_(1, ofBytes(bytes)),
        session_(card_),
        reader_(session_.device(), kFirstFile, bytes) {
    session_.enumerate();
    session_.device().dropSignals();
  }

  std::uint64_t size() const { return size_; }
  const Card& card() const { return card_; }
  WireClient& client() { return session_.device(); }
  ObjectReader& reader() { return reader_; }
  /// Bytes in a nanosecond, which is GB/s, of reading the file in so many milliseconds.
  double rate(double milliseconds) const { return static_cast<double>(size_) / milliseconds / 1e6; }

 private:
  const std::uint64_t size_;
  const Card card_;
  WireSession session_;
  ObjectReader reader_;
};

std::string gigabytes(double rate) { return inUnits(rate, "GB/s"); }

/// Rates of one way to read, each with that of something else just before.
class RateComparison {
 public:
  /// Both give GB/s. The first turn does not count.
  template <class Bare, class Served>
  RateComparison(int turns, Bare bare, Served served) {
    bare();
    served();
    for (int i = 0; i < turns; ++i) {
      bare_.push_back(bare());
      served_.push_back(served());
    }
  }
  void print(const std::string& bareWhat, const std::string& what, double least) const {
    const double ratio = medianRatio(served_, bare_);
    printFigure(bareWhat, gigabytes(median(bare_)), 1);
    printFigure(what, gigabytes(median(served_)), ratio, atLeast(least, ratio));
  }

 private:
  std::vector<double> bare_, served_;
};

// ---------------------------------------------------------------------------------------------- fresh memory

/// A bare loop that uses new memory for each piece.
struct BareLoop {
  const char* what;
  Filling filling;
  void (*look)(const UniqueFd& file, std::size_t size);
};

constexpr std::array<BareLoop, 4> kBareLoops{
    {{"bare: new memory, mapped and read into", Filling::byMapping, mapAndTouch},
     {"bare: new memory, mapped and read into, client populates", Filling::byMapping, populateAndTouch},
     {"bare: new memory, sendfile", Filling::bySendfile, mapAndTouch},
     {"bare: new memory, sendfile, client populates", Filling::bySendfile, populateAndTouch}}};

double rateOfBareLoop(const BareLoop& loop, const LargeFile& file) {
  FreshMemoryProcess process(file.card().firstFile(), loop.filling);
  return file.rate(millisecondsOf([&] {
    for (std::uint64_t offset = 0; offset < file.size(); offset += kPiece) {
      const std::uint64_t length = std::min(kPiece, file.size() - offset);
      loop.look(process.part(offset, length), length);
    }
  }));
}

/// The loop with the highest rate, after a few turns of all.
const BareLoop& fastestBareLoop(const LargeFile& file, const Options& options) {
  std::array<std::vector<double>, kBareLoops.size()> rates;
  for (int turn = 0; turn < options.pick(5, 3); ++turn) {
    for (std::size_t i = 0; i < rates.size(); ++i) rates[i].push_back(rateOfBareLoop(kBareLoops[i], file));
  }
  const auto best = std::ranges::max_element(rates, {}, median);
  return kBareLoops[static_cast<std::size_t>(best - rates.begin())];
}

void compareStream(LargeFile& file, const Options& options) {
  const BareLoop& bare = fastestBareLoop(file, options);
  const RateComparison rates(
      options.pick(15, 3), [&] { return rateOfBareLoop(bare, file); },
      [&] { return file.rate(millisecondsOf([&] { file.reader().readStream(); })); });
  rates.print(bare.what, "stream, memory of the service", kLeastOfBareLoop);
}

// --------------------------------------------------------------------------------------------- other
// programs

double rateOfBuffers(LargeFile& file) {
  return file.rate(millisecondsOf([&] { file.reader().readIntoBuffers(); }));
}

/// As dd itself says, so that its start does not count.
double rateOfDd(const LargeFile& file) {
  const Outcome outcome = runOrThrow({"env", "LC_ALL=C", "dd", "if=" + file.card().firstFile(),
                                      "of=/dev/null", "bs=" + std::to_string(kPiece)});
  constexpr std::string_view kBeforeSeconds = "copied, ";
  const std::size_t found = outcome.errors.find(kBeforeSeconds);
  if (found == std::string::npos) throw std::runtime_error("dd says no time: " + outcome.errors);
  return file.rate(std::strtod(outcome.errors.c_str() + found + kBeforeSeconds.size(), nullptr) * 1000);
}

void compareWithDd(LargeFile& file, const Options& options) {
  const RateComparison rates(
      options.pick(15, 3), [&] { return rateOfDd(file); }, [&] { return rateOfBuffers(file); });
  rates.print("bare: dd", "two buffers of the client in turn", kLeastOfCopying);
}

double rateOfPeer(const LargeFile& file) {
  return file.rate(
      runOrThrow({"gphoto2", "--camera", "Mass Storage Camera", "--port", "disk:" + file.card().path(),
                  "--folder", Card::firstFolder(), "--stdout", "--get-file", file.card().firstName()})
          .milliseconds);
}

void compareWithPeer(LargeFile& file, const Options& options) {
  if (!isInstalled("gphoto2")) return printNote("gphoto2 is not installed: not compared with");
  const RateComparison rates(
      options.pick(5, 1), [&] { return rateOfPeer(file); }, [&] { return rateOfBuffers(file); });
  rates.print("gphoto2 --get-file, the whole program", "two buffers of the client in turn", kLeastOfPeer);
}

// ------------------------------------------------------------------------------------------------ small
// reads

/// Milliseconds for one, with a process that was just started: where the scheduler puts it is part of the
/// figure.
double timeOfBareRoundTrip(std::size_t count) {
  const std::string message(kBareMessage, '.');
  EchoProcess echo(message.size(), message);
  const UniqueFd socket = echo.takeSocket();
  const auto roundTrips = [&](std::size_t times) {
    for (std::size_t i = 0; i < times; ++i) {
      test::sendAll(socket.get(), message);
      if (test::receive(socket.get(), message.size()) != message) throw std::runtime_error("no echo");
    }
  };
  roundTrips(count / 10);
  return millisecondsOf([&] { roundTrips(count); }) / static_cast<double>(count);
}

void checkSmallRead(WireClient& client) {
  const std::string request = rangeRequest(kFirstFile, 0, kSmallRead);
  if (client.call(kDeviceInterface, kReadMember, kReadSignature, request).size() < kSmallRead) {
    throw std::runtime_error("the read gave too few bytes");
  }
}

void compareSmallReads(LargeFile& file, const Options& options) {
  checkSmallRead(file.client());
  const std::string request = test::methodCall(1, kDeviceInterface, kReadMember, kReadSignature,
                                               rangeRequest(kFirstFile, 0, kSmallRead));
  const auto count = options.pick<std::size_t>(5'000, 2'000);
  std::vector<double> bare, served;
  file.client().roundTrips(request, count, 1);
  for (int i = 0; i < options.pick(31, 5); ++i) {
    bare.push_back(timeOfBareRoundTrip(count));
    served.push_back(file.client().roundTrips(request, count, 1));
  }
  const double ratio = medianRatio(served, bare);
  printFigure("bare: round trip of 64 bytes", inUnits(median(bare) * 1000, "us"), 1);
  printFigure("read of 4 KiB, one at a time", inUnits(median(served) * 1000, "us"), ratio,
              atMost(kMostRoundTrips, ratio));
}

void compareOneFile(const Options& options) {
  LargeFile file(options.pick<std::uint64_t>(1024, 64) << 20);
  compareStream(file, options);
  compareWithDd(file, options);
  compareWithPeer(file, options);
  compareSmallReads(file, options);
}

}  // namespace
}  // namespace brivo::bench

int main(int count, char** words) {
  using namespace brivo::bench;
  return runBenchmark(count, words, [](const Options& options) {
    compareOneFile(options);
    printMemoryFigures(options);
    printImportFigure(options);
  });
}
