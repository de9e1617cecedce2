// SPDX-License-Identifier: MIT
// How long a catalogue takes, how it grows, and what it costs in memory; the same with what is in pictures.
#include <sys/socket.h>

#include <algorithm>
#include <stdexcept>

#include "bare_walk.h"
#include "echo_process.h"
#include "in_process_catalogue.h"
#include "movie_figures.h"
#include "options.h"
#include "picture_figures.h"
#include "raw_figure.h"
#include "remote_catalogue.h"
#include "wire_session.h"

namespace brivo::bench {
namespace {

constexpr double kMostOverBareWalk = 1.5;
/// What a batch of one file takes on the wire.
constexpr std::size_t kBatchBytes = 400;
constexpr double kFirstBatchMilliseconds = 10;
constexpr double kMostOverBareListing = 2;
constexpr double kLeastGrowth = 0.8;
constexpr double kMostGrowth = 1.2;
constexpr double kMostMegabytes = 60;
constexpr double kObjectsOfMemoryTarget = 100'000;

void check(bool isAsMade) {
  if (!isAsMade) throw std::runtime_error("the card is not as it was made");
}

double timeOfBareListing(const Card& card) {
  return millisecondsOf([&] { check(countNames(card.path()) == card.files()); });
}

/// With the counting that the service does before it walks.
double timeOfBareWalk(const Card& card) {
  return millisecondsOf([&] {
    check(countNames(card.path()) == card.files());
    check(walkWithValues(card.path()) == card.files());
  });
}

/// The same, and each file told in a message of its own to a process that reads; until it has read all.
double timeOfBareWalkWithSends(const Card& card) {
  const std::string message(kBatchBytes, '.');
  EchoProcess reader(message.size() * card.files(), ".");
  const UniqueFd socket = reader.takeSocket();
  return millisecondsOf([&] {
    check(countNames(card.path()) == card.files());
    check(walkWithValues(card.path(), [&] {
            check(::send(socket.get(), message.data(), message.size(), MSG_NOSIGNAL) > 0);
          }) == card.files());
    char done = 0;
    check(::recv(socket.get(), &done, 1, 0) == 1);
  });
}

std::string filesOf(const Card& card) { return grouped(card.files()) + " files"; }

/// Times of one way to have the catalogue made, each with that of a bare loop just before.
class Comparison {
 public:
  Comparison(std::string what, std::string bareWhat, double (*bare)(const Card&), const Card& card)
      : what_(std::move(what)), bareWhat_(std::move(bareWhat)), timeOfBare_(bare), card_(card) {}

  /// `catalogue` gives its milliseconds.
  template <class Catalogue>
  void add(Catalogue catalogue) {
    timeOfBareWalk(card_);
    bare_.push_back(timeOfBare_(card_));
    times_.push_back(catalogue());
  }
  void print() const {
    const double ratio = medianRatio(times_, bare_);
    printFigure(bareWhat_, inMilliseconds(median(bare_)), 1);
    printFigure(what_ + ", " + filesOf(card_), inMilliseconds(median(times_)), ratio,
                atMost(kMostOverBareWalk, ratio));
  }

 private:
  const std::string what_;
  const std::string bareWhat_;
  double (*const timeOfBare_)(const Card&);
  const Card& card_;
  std::vector<double> bare_, times_;
};

/// The whole catalogue, against the bare walk. Each repetition has a fresh device.
void compareWithBareWalk(const Options& options) {
  const Card card(options.pick<std::size_t>(20'000, 2'000));
  const auto sending = [&](const char* what) {
    return Comparison(what, "bare walk, a message for each file", timeOfBareWalkWithSends, card);
  };
  Comparison within("catalogue in process", "bare walk", timeOfBareWalk, card);
  Comparison wire = sending("catalogue over the socket, client only reads");
  Comparison library = sending("catalogue over the socket, OrvidCore");
  InProcessCatalogue inProcess;
  for (int i = 0; i < options.pick(15, 3); ++i) {
    within.add([&] { return inProcess.enumerate(card); });
    WireSession session(card);
    wire.add([&] { return session.enumerate(); });
    RemoteCatalogue remote(card);
    library.add([&] { return remote.enumerate().last; });
  }
  within.print();
  wire.print();
  library.print();
}

/// What repeated catalogues of one card took.
struct Series {
  explicit Series(std::size_t files) : card(files) {}

  void add() {
    RemoteCatalogue catalogue(card);
    const double before = catalogue.service().process().settledKilobytes();
    timeOfBareWalk(card);
    listing.push_back(timeOfBareListing(card));
    const CatalogueTimes times = catalogue.enumerate();
    ready.push_back(times.ready);
    firstBatch.push_back(times.firstBatch);
    firstFile.push_back(times.firstFile);
    last.push_back(times.last);
    kilobytes.push_back(catalogue.service().process().settledKilobytes() - before);
  }

  const Card card;
  std::vector<double> listing, ready, firstBatch, firstFile, last, kilobytes;
};

void printFirst(const char* what, const std::vector<double>& times, double listing, const Card& card) {
  const double time = median(times);
  // A large card may take longer than that: twice as long as listing it.
  const double limit = std::max(kFirstBatchMilliseconds, kMostOverBareListing * listing);
  printFigure(std::string(what) + ", " + filesOf(card), inMilliseconds(time), time / listing,
              Target{"<= " + inMilliseconds(limit), time <= limit});
}

void printFirstOf(const Series& series) {
  const double listing = median(series.listing);
  printFigure("bare listing, " + filesOf(series.card), inMilliseconds(listing), 1);
  printFirst("ready note", series.ready, listing, series.card);
  printFirst("first batch (a folder)", series.firstBatch, listing, series.card);
  printFirst("first batch with a file", series.firstFile, listing, series.card);
}

void printGrowth(const Series& small, const Series& large) {
  const double times = static_cast<double>(large.card.files()) / static_cast<double>(small.card.files());
  const double growth = median(large.last) / median(small.last) / times;
  printFigure("catalogue over the socket, " + filesOf(small.card), inMilliseconds(median(small.last)));
  printFigure("catalogue over the socket, " + filesOf(large.card), inMilliseconds(median(large.last)));
  printFigure("growth against linear", inUnits(times, "x files"), growth,
              brivo::bench::within(kLeastGrowth, kMostGrowth, growth));
}

void printMemory(const Series& series) {
  const double objects = static_cast<double>(series.card.objects());
  const double megabytes = median(series.kilobytes) / 1024 / objects * kObjectsOfMemoryTarget;
  printFigure("resident memory per 100,000 objects", inUnits(megabytes, "MiB"), std::nullopt,
              atMost(kMostMegabytes, megabytes, "MiB"));
}

void compareSizes(const Options& options) {
  Series small(options.pick<std::size_t>(10'000, 1'000));
  Series large(options.pick<std::size_t>(100'000, 10'000));
  for (int i = 0; i < options.pick(7, 3); ++i) {
    small.add();
    large.add();
  }
  printFirstOf(small);
  printGrowth(small, large);
  printMemory(large);
}

}  // namespace
}  // namespace brivo::bench

int main(int count, char** words) {
  using namespace brivo::bench;
  return runBenchmark(count, words, [](const Options& options) {
    compareWithBareWalk(options);
    compareSizes(options);
    printPictureFigures(options);
    printRawFigure(options);
    printMovieFigures(options);
  });
}
