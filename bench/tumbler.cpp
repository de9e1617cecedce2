// SPDX-License-Identifier: MIT
#include "tumbler.h"

#include <fcntl.h>
#include <signal.h>

#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <stdexcept>

#include "command.h"
#include "figures.h"
#include "platform/base/unique_fd.h"
#include "support/raw_dbus.h"
#include "support/wait.h"

namespace brivo::bench {

namespace {

constexpr const char* kName = "org.freedesktop.thumbnails.Thumbnailer1";
constexpr const char* kPath = "/org/freedesktop/thumbnails/Thumbnailer1";
constexpr std::uint64_t kWaitMicroseconds = 60'000'000;

void check(int result) {
  if (result < 0) throw std::runtime_error(std::string("tumbler: ") + std::strerror(-result));
}

bool holdsMovieType(sd_bus_message* message) {
  check(sd_bus_message_enter_container(message, SD_BUS_TYPE_ARRAY, "s"));
  const char* type = nullptr;
  bool found = false;
  while (sd_bus_message_read(message, "s", &type) > 0)
    found = found || std::strcmp(type, "video/quicktime") == 0;
  return found;
}

}  // namespace

std::unique_ptr<Tumbler> Tumbler::startForMovies() {
  if (isInstalled("dbus-daemon")) {
    std::unique_ptr<Tumbler> tumbler(new Tumbler);
    tumbler->startBus();
    if (tumbler->readsMovies()) return tumbler;
  }
  printNote("no comparison with tumbler: it needs dbus-daemon, tumbler and tumbler-plugins-extra");
  return nullptr;
}

void Tumbler::startBus() {
  const std::string socket = folder_ / "bus", address = "unix:path=" + socket;
  const UniqueFd nowhere(::open("/dev/null", O_RDWR | O_CLOEXEC));
  const char* const path = std::getenv("PATH");
  busProcess_ = start({{"dbus-daemon", "--session", "--nofork", "--nopidfile", "--address=" + address},
                       {std::string("PATH=") + (path ? path : "/usr/bin"), "HOME=" + folder_.path(),
                        "XDG_CACHE_HOME=" + folder_ / "cache", "XDG_RUNTIME_DIR=" + folder_.path(),
                        "DBUS_SESSION_BUS_ADDRESS=" + address, "GIO_USE_VFS=local"},
                       nowhere.get(),
                       nowhere.get()});
  if (!test::waitUntil([&] { return test::isListening(socket); }))
    throw std::runtime_error("dbus-daemon did not start");
  sd_bus* bus = nullptr;
  check(sd_bus_new(&bus));
  bus_.reset(bus);
  check(sd_bus_set_address(bus, address.c_str()));
  check(sd_bus_set_bus_client(bus, 1));
  check(sd_bus_start(bus));
  for (const auto& [signal, handler] : {std::pair{"Finished", &hasFinished}, {"Error", &hasFailed}})
    check(sd_bus_match_signal(bus, nullptr, kName, kPath, kName, signal, handler, this));
}

bool Tumbler::readsMovies() {
  sd_bus_message* answer = nullptr;
  if (sd_bus_call_method(bus_.get(), kName, kPath, kName, "GetSupported", nullptr, &answer, "") < 0)
    return false;
  const std::unique_ptr<sd_bus_message, decltype(&sd_bus_message_unref)> owned(answer, sd_bus_message_unref);
  check(sd_bus_message_skip(answer, "as"));
  return holdsMovieType(answer);
}

Tumbler::~Tumbler() {
  bus_.reset();
  ::kill(busProcess_, SIGTERM);
  exitCodeOf(busProcess_);
}

int Tumbler::hasFinished(sd_bus_message*, void* self, sd_bus_error*) {
  static_cast<Tumbler*>(self)->isFinished_ = true;
  return 0;
}

int Tumbler::hasFailed(sd_bus_message* message, void* self, sd_bus_error*) {
  const char* text = nullptr;
  check(sd_bus_message_skip(message, "uasi"));
  check(sd_bus_message_read(message, "s", &text));
  static_cast<Tumbler*>(self)->failure_ = text;
  return 0;
}

void Tumbler::request(const std::string& path, const std::string& type) {
  const std::string uri = "file://" + path;
  constexpr std::uint32_t kNothingToDequeue = 0;
  check(sd_bus_call_method(bus_.get(), kName, kPath, kName, "Queue", nullptr, nullptr, "asasssu", 1,
                           uri.c_str(), 1, type.c_str(), "normal", "foreground", kNothingToDequeue));
}

double Tumbler::timeOfThumbnail(const std::string& path, const std::string& type) {
  std::filesystem::remove_all(folder_ / "cache");
  isFinished_ = false;
  const Stopwatch watch;
  request(path, type);
  while (!isFinished_) {
    if (sd_bus_process(bus_.get(), nullptr) == 0) check(sd_bus_wait(bus_.get(), kWaitMicroseconds));
  }
  const double time = watch.milliseconds();
  if (!failure_.empty()) throw std::runtime_error("tumbler: " + failure_);
  return time;
}

}  // namespace brivo::bench
