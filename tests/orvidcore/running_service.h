// SPDX-License-Identifier: MIT
#pragma once

#include <sys/types.h>

#include <string>
#include <string_view>
#include <vector>

#include "support/temporary_folder.h"

namespace orvid::test {

/// The real brivod as a child process, with folders and settings of its own. Its log must show no sanitizer's
/// report when it goes. *Thread-bound.*
class RunningService {
 public:
  enum class Grants { thisProgram, nobody };

  /// Grants and starts; the service's socket is there when it returns.
  explicit RunningService(Grants grants = Grants::thisProgram);
  /// Ends the service, which must succeed unless it was killed.
  ~RunningService();
  RunningService(const RunningService&) = delete;
  RunningService& operator=(const RunningService&) = delete;

  /// D-Bus address of the manager's socket.
  std::string address() const { return "unix:path=" + folder_ / "run/manager"; }
  /// A path beside the service's own folders, for files of the test.
  std::string besides(std::string_view name) const { return folder_ / name; }
  std::string log() const { return brivo::test::readFile(folder_ / "log"); }
  std::string runtimeFolder() const { return folder_ / "run"; }

  /// Where the card `name` is, or would be.
  std::string card(std::string_view name) const { return folder_ / ("volumes/" + std::string(name)); }
  /// Makes a file of a card, "100ABCDE/IMG_0001.JPG" below its DCIM, and gives its path.
  std::string addFile(std::string_view card, std::string_view name, std::string_view content) const;
  /// Makes a card, with an empty DCIM, appear in one step.
  void insertEmptyCard(std::string_view name) const;
  /// Takes a card out by moving it away.
  void removeCard(std::string_view name) const;

  /// SIGKILL; returns when it has ended.
  void kill();
  /// SIGSTOP and SIGCONT; pause() returns when it has stopped.
  void pause();
  void goOn();

 private:
  std::vector<std::string> environment() const;
  pid_t launch(std::vector<std::string> command) const;
  void grantThisProgram() const;

  const brivo::test::TemporaryFolder folder_;
  pid_t process_ = 0;  // 0 when it was killed
};

}  // namespace orvid::test
