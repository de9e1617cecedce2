// SPDX-License-Identifier: MIT
// What a request costs on the wire, and what idle clients cost.
#include <stdexcept>

#include "echo_process.h"
#include "figures.h"
#include "marshalled_options.h"
#include "options.h"
#include "support/raw_dbus.h"
#include "support/wait.h"
#include "wire_session.h"

namespace brivo::bench {
namespace {

constexpr std::size_t kOutstanding = 64;
constexpr std::size_t kIdleClients = 200;
constexpr char kContent = 'Z';

/// One kind of request.
struct Request {
  std::string what;
  const char* interface;
  const char* member;
  const char* signature;
  std::string body;

  std::string call() const { return test::methodCall(1, interface, member, signature, body); }
  std::string answer(WireClient& client) const { return client.call(interface, member, signature, body); }
};

Request ping() { return {"D-Bus ping", "org.freedesktop.DBus.Peer", "Ping", "", ""}; }

Request unknownMetadata() {
  return {"metadata of an unknown handle", kDeviceInterface,
          "requestMetadataForObjectHandle_options_withReply", "ta{sv}",
          marshalled(0xFFFF'FFF0) + noOptions()};
}

/// The one file of the card comes after its two folders.
Request oneByte() {
  return {"read of one byte", kDeviceInterface, "requestReadDataFromObjectHandle_options_withReply", "ta{sv}",
          marshalled(3) + noOptions()};
}

void checkOneByte(WireClient& client) {
  const std::string oneByteOfData{1, 0, 0, 0, kContent};
  if (oneByte().answer(client).find(oneByteOfData) == std::string::npos) {
    throw std::runtime_error("the read gave no byte");
  }
}

/// Of a fresh echo process: where the scheduler puts it is part of the figure.
double timeOfEcho(const Request& request, const std::string& answer, std::size_t count,
                  std::size_t outstanding) {
  EchoProcess echo(request.call().size(), answer);
  WireClient client(echo.takeSocket());
  client.roundTrips(request.call(), count / 10, outstanding);
  return client.roundTrips(request.call(), count, outstanding);
}

void compareWithEcho(WireClient& service, const Request& request, std::size_t outstanding,
                     const Options& options) {
  const std::string answer = request.answer(service);
  const auto count = options.pick<std::size_t>(5'000, 2'000);
  std::vector<double> bare, served;
  service.roundTrips(request.call(), count, outstanding);
  for (int i = 0; i < options.pick(31, 3); ++i) {
    bare.push_back(timeOfEcho(request, answer, count, outstanding));
    served.push_back(service.roundTrips(request.call(), count, outstanding));
  }
  const std::string how = outstanding == 1 ? ", one at a time" : ", " + grouped(outstanding) + " outstanding";
  const auto perSecond = [](double milliseconds) { return inUnits(1 / milliseconds, "k/s"); };
  printFigure("bare: " + request.what + how, perSecond(median(bare)), 1);
  printFigure(request.what + how, perSecond(median(served)), medianRatio(served, bare));
}

void compareRoundTrips(const Options& options) {
  const Card card(1, std::string(1, kContent));
  WireSession session(card);
  session.enumerate();
  session.device().dropSignals();
  checkOneByte(session.device());
  for (const Request& request : {ping(), unknownMetadata(), oneByte()}) {
    compareWithEcho(session.device(), request, 1, options);
    compareWithEcho(session.device(), request, kOutstanding, options);
  }
}

std::vector<WireClient> connectIdleClients(const ServiceProcess& service) {
  std::vector<WireClient> clients;
  for (std::size_t i = 0; i < kIdleClients; ++i) {
    clients.push_back(WireClient::authenticated(service.managerSocket()));
    clients.back().call(kManagerInterface, "requestDeviceListWithReply");
  }
  return clients;
}

/// The threads when those that only helped out have gone, which takes them a second.
std::size_t settledThreads(const ServiceProcess& service, std::size_t expected) {
  test::waitUntil([&] { return service.process().threadCount() <= expected; }, std::chrono::seconds(3));
  return service.process().threadCount();
}

void printCostOfIdleClients(const ServiceProcess& service, std::size_t threads, double kilobytes) {
  const std::size_t threadsNow = settledThreads(service, threads);
  const double perClient =
      (service.process().settledKilobytes() - kilobytes) / static_cast<double>(kIdleClients);
  printFigure("threads before and with " + grouped(kIdleClients) + " idle clients",
              std::to_string(threads) + " -> " + std::to_string(threadsNow), std::nullopt,
              Target{"no more", threadsNow <= threads});
  printFigure("resident memory per idle client", inUnits(perClient, "KiB"));
}

/// One client of one service, by turns with idle clients and without.
void compareIdleClients(const Options& options) {
  const Card card(1);
  WireSession session(card);
  const std::size_t threads = settledThreads(session.service(), 0);
  const double kilobytes = session.service().process().settledKilobytes();
  const std::string request = unknownMetadata().call();
  const auto count = options.pick<std::size_t>(5'000, 2'000);
  std::vector<double> alone, amongIdle;
  for (int i = 0; i < options.pick(31, 5); ++i) {
    session.device().roundTrips(request, count / 10, 1);
    alone.push_back(session.device().roundTrips(request, count, 1));
    const auto idle = connectIdleClients(session.service());
    session.device().roundTrips(request, count / 10, 1);
    amongIdle.push_back(session.device().roundTrips(request, count, 1));
    if (i == 0) printCostOfIdleClients(session.service(), threads, kilobytes);
  }
  printFigure("round trip without idle clients", inUnits(median(alone) * 1000, "us"), 1);
  printFigure("round trip with " + grouped(kIdleClients) + " idle clients",
              inUnits(median(amongIdle) * 1000, "us"), medianRatio(amongIdle, alone));
}

}  // namespace
}  // namespace brivo::bench

int main(int count, char** words) {
  using namespace brivo::bench;
  return runBenchmark(count, words, [](const Options& options) {
    compareRoundTrips(options);
    compareIdleClients(options);
  });
}
