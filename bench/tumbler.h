// SPDX-License-Identifier: MIT
#pragma once

#include <systemd/sd-bus.h>

#include <memory>
#include <string>

#include "support/temporary_folder.h"

namespace brivo::bench {

/// The thumbnailing service of Xfce on a session bus of its own, with a cache of its own. *Thread-bound.*
class Tumbler {
 public:
  /// Null, with a note, when it is not installed or cannot read movies.
  static std::unique_ptr<Tumbler> startForMovies();
  ~Tumbler();
  Tumbler(const Tumbler&) = delete;
  Tumbler& operator=(const Tumbler&) = delete;

  /// Has it make a thumbnail of 128 pixels, which is a PNG file in its cache, and waits until it has; gives
  /// milliseconds. Throws when it fails.
  double timeOfThumbnail(const std::string& path, const std::string& type);

 private:
  struct CloseBus {
    void operator()(sd_bus* bus) const { sd_bus_flush_close_unref(bus); }
  };

  Tumbler() = default;
  void startBus();
  bool readsMovies();
  void request(const std::string& path, const std::string& type);
  static int hasFinished(sd_bus_message* message, void* self, sd_bus_error*);
  static int hasFailed(sd_bus_message* message, void* self, sd_bus_error*);

  const test::TemporaryFolder folder_;
  pid_t busProcess_ = -1;
  std::unique_ptr<sd_bus, CloseBus> bus_;
  bool isFinished_ = false;
  std::string failure_;
};

}  // namespace brivo::bench
