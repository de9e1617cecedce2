// SPDX-License-Identifier: MIT
#include "picture_figures.h"

#include <stdexcept>

#include "bare_walk.h"
#include "picture_peers.h"
#include "pictures.h"
#include "remote_catalogue.h"
#include "wire_session.h"

namespace brivo::bench {

namespace {

constexpr double kMostOverBareReads = 1;
constexpr double kLeastGrowth = 0.8;
constexpr double kMostGrowth = 1.2;
constexpr double kLeastTimesFasterThanExiftool = 250;
/// What gphoto2 2.5.28 peaks at while it lists 10,000 pictures.
constexpr double kMegabytesOfGphoto2 = 21;
constexpr double kMostBytesOfMemory = 600;

std::string picturesOf(const Card& card) { return grouped(card.files()) + " pictures"; }

double timeOfBareReads(const Card& card) {
  return millisecondsOf([&] {
    if (readHeads(card.path()) != card.files()) throw std::runtime_error("the card is not as it was made");
  });
}

/// What repeated catalogues of one card took, each after the same work done by others.
struct Series {
  Series(const Pictures& pictures, std::size_t files, std::vector<PicturePeer> others)
      : card(files, pictures.inOrder()), peers(std::move(others)), ofPeers(peers.size()) {}

  void add() {
    timeOfBareReads(card);  // warms the page cache
    bare.push_back(timeOfBareReads(card));
    addWire();
    addLibrary();
    for (std::size_t i = 0; i < peers.size(); ++i)
      ofPeers[i].push_back(millisecondsOf([&] { peers[i].read(card.path()); }));
  }

  void addWire() {
    WireSession session(card);
    const double before = session.service().process().bytesRead();
    wire.push_back(session.enumerate());
    bytesPerFile.push_back((session.service().process().bytesRead() - before) /
                           static_cast<double>(card.files()));
  }

  void addLibrary() {
    RemoteCatalogue catalogue(card);
    throughLibrary.push_back(catalogue.enumerate().last);
    withSize = catalogue.filesWithSize();
    kilobytes.push_back(catalogue.service().process().settledKilobytes());
  }

  const Card card;
  const std::vector<PicturePeer> peers;
  std::vector<double> bare, wire, throughLibrary, bytesPerFile, kilobytes;
  std::vector<std::vector<double>> ofPeers;
  std::size_t withSize = 0;
};

void printTime(const std::string& what, const std::vector<double>& times, const Series& series) {
  const double ratio = medianRatio(times, series.bare);
  printFigure(what + ", " + picturesOf(series.card), inMilliseconds(median(times)), ratio,
              atMost(kMostOverBareReads, ratio));
}

void printTimes(const Series& series) {
  printFigure("bare reads, " + picturesOf(series.card), inMilliseconds(median(series.bare)), 1);
  printTime("catalogue, client only reads", series.wire, series);
  printTime("catalogue, OrvidCore", series.throughLibrary, series);
  const double told = static_cast<double>(series.withSize) / static_cast<double>(series.card.files());
  printFigure("pictures that are told of with their size", grouped(series.withSize), told, atLeast(1, told));
}

void printPeers(const Series& series) {
  for (std::size_t i = 0; i < series.peers.size(); ++i) {
    const double ratio = medianRatio(series.throughLibrary, series.ofPeers[i]);
    const auto most = series.peers[i].mostRatio;
    printFigure("catalogue to " + series.peers[i].name, inMilliseconds(median(series.ofPeers[i])), ratio,
                most ? std::optional(atMost(*most, ratio)) : std::nullopt);
  }
}

void printExiftool(const Series& series, const PicturePeer& exiftool) {
  const double time = millisecondsOf([&] { exiftool.read(series.card.path()); });
  const double ratio = time / median(series.throughLibrary);
  printFigure(exiftool.name + " to catalogue, " + picturesOf(series.card), inMilliseconds(time), ratio,
              atLeast(kLeastTimesFasterThanExiftool, ratio));
}

void printGrowth(const Series& small, const Series& large) {
  const double times = static_cast<double>(large.card.files()) / static_cast<double>(small.card.files());
  const double growth = median(large.throughLibrary) / median(small.throughLibrary) / times;
  printFigure("growth against linear", inUnits(times, "x pictures"), growth,
              within(kLeastGrowth, kMostGrowth, growth));
}

void printMemory(const Series& small, const Series& large) {
  const double megabytes = median(large.kilobytes) / 1024;
  const double ratio = megabytes / kMegabytesOfGphoto2;
  printFigure("resident memory to the peak of gphoto2, " + picturesOf(large.card), inUnits(megabytes, "MiB"),
              ratio, atMost(1, ratio));
  const double further = static_cast<double>(large.card.files() - small.card.files());
  const double bytes = (median(large.kilobytes) - median(small.kilobytes)) * 1024 / further;
  printFigure("resident memory per further picture", inUnits(bytes, "B"), std::nullopt,
              atMost(kMostBytesOfMemory, bytes, "B"));
}

}  // namespace

void printPictureFigures(const Options& options) {
  const auto files = options.pick<std::size_t>(10'000, 1'000);
  const auto pictures = Pictures::find(options, files);
  if (!pictures) return;
  const std::vector<PicturePeer> peers = picturePeers();
  Series small(*pictures, files / 10, peers), large(*pictures, files, peers);
  for (int i = 0; i < options.pick(9, 3); ++i) {
    small.add();
    large.add();
  }
  for (const Series* series : {&small, &large}) {
    printTimes(*series);
    printPeers(*series);
  }
  if (const auto peer = exiftool()) printExiftool(small, *peer);
  printGrowth(small, large);
  printFigure("bytes read per picture", inUnits(median(large.bytesPerFile), "B"));
  printMemory(small, large);
}

}  // namespace brivo::bench
