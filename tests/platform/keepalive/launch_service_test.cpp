// SPDX-License-Identifier: MIT
// With a launch service that is a socket of the test's, as sd_notify(3) describes it.
#include "platform/keepalive/launch_service.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <cstring>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "platform/base/unique_fd.h"
#include "support/environment.h"
#include "support/temporary_folder.h"
#include "support/wait.h"

namespace brivo {
namespace {

using test::waitUntil;
using testing::ElementsAre;
using testing::HasSubstr;

/// Reads what it is told and closes the descriptors that come along, which is its answer to a barrier.
class StandInLaunchService {
 public:
  explicit StandInLaunchService(const std::string& path)
      : socket_(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0)) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::memcpy(address.sun_path, path.c_str(), path.size() + 1);
    EXPECT_EQ(::bind(socket_.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
    thread_ = std::thread([this] {
      while (receive()) {
      }
    });
  }
  ~StandInLaunchService() {
    ::shutdown(socket_.get(), SHUT_RDWR);
    thread_.join();
  }
  StandInLaunchService(const StandInLaunchService&) = delete;
  StandInLaunchService& operator=(const StandInLaunchService&) = delete;

  std::vector<std::string> told() {
    const std::lock_guard lock(mutex_);
    return told_;
  }

 private:
  bool receive() {
    char text[1024];
    alignas(cmsghdr) char control[CMSG_SPACE(sizeof(int))];
    iovec part{text, sizeof text};
    msghdr message{};
    message.msg_iov = &part;
    message.msg_iovlen = 1;
    message.msg_control = control;
    message.msg_controllen = sizeof control;
    const ssize_t size = ::recvmsg(socket_.get(), &message, MSG_CMSG_CLOEXEC);
    if (size <= 0) return false;
    {
      const std::lock_guard lock(mutex_);
      told_.emplace_back(text, static_cast<std::size_t>(size));
    }
    const cmsghdr* header = CMSG_FIRSTHDR(&message);
    if (header && header->cmsg_type == SCM_RIGHTS) {
      int fd = -1;
      std::memcpy(&fd, CMSG_DATA(header), sizeof fd);
      UniqueFd close(fd);
    }
    return true;
  }

  UniqueFd socket_;
  std::mutex mutex_;
  std::vector<std::string> told_;
  std::thread thread_;
};

class LaunchServiceTest : public testing::Test {
 protected:
  test::TemporaryFolder folder;
  StandInLaunchService standIn{folder / "notify"};
  test::ScopedVariable variable{"NOTIFY_SOCKET", folder / "notify"};
  RunLoop loop;
  LaunchService launchService{loop};
};

TEST_F(LaunchServiceTest, ItIsToldThatTheServiceIsReady) {
  LaunchService::ready();
  EXPECT_TRUE(waitUntil([&] { return !standIn.told().empty(); }));
  EXPECT_THAT(standIn.told(), ElementsAre("READY=1\nSTATUS=Serving"));
}

TEST_F(LaunchServiceTest, StoppingReturnsWhenItHasTakenNote) {
  launchService.stopping();
  EXPECT_THAT(standIn.told(), ElementsAre(HasSubstr("STOPPING=1"), HasSubstr("BARRIER=1")));
}

TEST_F(LaunchServiceTest, WhoStaysAfterAllAsksForPatience) {
  launchService.stopping();
  launchService.notYet();
  EXPECT_TRUE(waitUntil([&] { return standIn.told().size() == 4; }));
  EXPECT_EQ(standIn.told().back(), "EXTEND_TIMEOUT_USEC=60000000");
}

}  // namespace
}  // namespace brivo
