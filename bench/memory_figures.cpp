// SPDX-License-Identifier: MIT
#include "memory_figures.h"

#include <sys/socket.h>

#include <deque>
#include <stdexcept>
#include <vector>

#include "child_process.h"
#include "figures.h"
#include "object_reader.h"
#include "wire_session.h"

namespace brivo::bench {

namespace {

constexpr double kMostGrowthWithSize = 8;
constexpr double kMostForOneReader = 32;
constexpr double kMostForAllReaders = 150;
constexpr std::size_t kReaders = 10;
constexpr std::uint64_t kMegabyte = 1'048'576;

/// Of a service that was just started and streams one file without blocks on the disk.
double peakOfOneReader(std::uint64_t size) {
  const Card card(1, ofNothing(size));
  WireSession session(card);
  session.enumerate();
  session.device().dropSignals();
  ObjectReader reader(session.device(), kFirstFile, size);
  return peakAboveRest({session.service().process()}, [&] { reader.readStream(); });
}

// ---------------------------------------------------------------------------------------------- many at a
// time

constexpr char kSignal = '.';

void signalTo(int socket) { ::send(socket, &kSignal, sizeof kSignal, MSG_NOSIGNAL); }

void waitForSignal(int socket) {
  char signal = 0;
  if (::recv(socket, &signal, sizeof signal, 0) != sizeof signal) {
    throw std::runtime_error("a process that reads has ended");
  }
}

/// A client of its own, as each has but one connection to a device: says when it is connected, reads when it
/// is told to, says when it has.
void readWhenTold(int socket, const std::string& deviceSocket, std::uint64_t handle, std::uint64_t size) {
  WireClient client = WireClient::authenticated(deviceSocket);
  client.call(kDeviceInterface, "requestStartUsingDeviceWithReply");
  signalTo(socket);
  waitForSignal(socket);
  ObjectReader(client, handle, size).readStream();
  signalTo(socket);
}

/// Of a service that was just started and streams a file to each of several processes.
double peakOfAllReaders(std::uint64_t size) {
  const Card card(kReaders, ofNothing(size));
  WireSession session(card);
  session.enumerate();
  std::deque<ChildProcess> readers;
  for (std::size_t i = 0; i < kReaders; ++i) {
    readers.emplace_back(
        [&](int socket) { readWhenTold(socket, session.deviceSocket(), kFirstFile + i, size); });
    waitForSignal(readers.back().socket());
  }
  return peakAboveRest({session.service().process()}, [&] {
    for (const ChildProcess& reader : readers) signalTo(reader.socket());
    for (const ChildProcess& reader : readers) waitForSignal(reader.socket());
  });
}

void printMegabytes(const std::string& what, double megabytes, double most) {
  printFigure(what, inUnits(megabytes, "MiB"), std::nullopt, atMost(most, megabytes, "MiB"));
}

std::string shownSize(std::uint64_t megabytes) {
  return megabytes < 1024 ? grouped(megabytes) + " MiB" : grouped(megabytes / 1024) + " GiB";
}

}  // namespace

void printMemoryFigures(const Options& options) {
  const auto small = std::uint64_t{1};
  const auto large = options.pick<std::uint64_t>(16'384, 1'024);
  const auto each = options.pick<std::uint64_t>(256, 64);
  std::vector<double> ofSmall, ofLarge, ofAll;
  for (int i = 0; i < options.pick(3, 1); ++i) {
    ofSmall.push_back(peakOfOneReader(small * kMegabyte));
    ofLarge.push_back(peakOfOneReader(large * kMegabyte));
    ofAll.push_back(peakOfAllReaders(each * kMegabyte));
  }
  const std::string what = "memory above rest, ";
  printFigure(what + "a stream of " + shownSize(small), inUnits(median(ofSmall), "MiB"));
  printMegabytes(what + "a stream of " + shownSize(large), median(ofLarge), kMostForOneReader);
  printMegabytes("difference of the two", median(ofLarge) - median(ofSmall), kMostGrowthWithSize);
  printMegabytes(what + grouped(kReaders) + " streams of " + shownSize(each), median(ofAll),
                 kMostForAllReaders);
}

}  // namespace brivo::bench
