// SPDX-License-Identifier: MIT
// Whom a device lets in, for processes that come and go: their numbers are free to be used again.
#include "device/device_service.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>

#include "access/access_database.h"
#include "device/brivo_device.h"
#include "device/fake_connection.h"
#include "imaging/local_image_decoder.h"
#include "imaging/local_movie_reader.h"
#include "platform/zeph/connection_service.h"
#include "support/temporary_folder.h"

namespace brivo {
namespace {

constexpr const char* kPhotos = "org.example.Photos";
/// What the system is to have called each of the processes of a test, one after the other.
constexpr std::int32_t kNumber = 4711;

class Process {
 public:
  Process() : pid_(::fork()) {
    if (pid_ == 0) ::_exit(::execl("/bin/sleep", "sleep", "1000", nullptr));
  }
  ~Process() {
    ::kill(pid_, SIGKILL);
    ::waitpid(pid_, nullptr, 0);
  }
  Process(const Process&) = delete;
  Process& operator=(const Process&) = delete;

  AuditToken token() const {
    return AuditToken::ofCredentials({kNumber, ::getuid()},
                                     UniqueFd(static_cast<int>(::syscall(SYS_pidfd_open, pid_, 0))));
  }

 private:
  pid_t pid_;
};

class AllApplications : public InstalledApplications {
 public:
  bool isInstalled(const std::string&) const override { return true; }
  std::optional<std::string> identifierOfProgram(dev_t, ino_t) const override { return std::nullopt; }
};

class NoPower : public PowerAssertions {
 public:
  Handle create(const std::string&, std::chrono::seconds) override { return nullptr; }
};

class DeviceServiceTest : public testing::Test {
 protected:
  ~DeviceServiceTest() override {
    device.reset();
    pool.waitUntilIdle();
  }

  bool isLetIn(const AuditToken& token) {
    const auto connection = std::make_shared<FakeConnection>(token);
    const bool letIn = service.shouldAcceptNewConnection(*device->listener(), connection);
    if (letIn) connection->interruptionHandler();
    return letIn;
  }

  test::TemporaryFolder card;
  test::TemporaryFolder home;
  test::TemporaryFolder runtime;
  Pool pool;
  zeph::ConnectionService connections{pool, nullptr};
  std::unique_ptr<zeph::RuntimeFolder> folder = std::move(zeph::RuntimeFolder::claim(runtime.path())).value();
  NoPower power;
  LocalImageDecoder images;
  LocalMovieReader movieReader;
  MovieService movies{movieReader, 1, 1};
  AllApplications applications;
  AccessDatabase database{pool, home / "data"};
  OVDeviceAccessManager access{database, applications, nullptr};
  DeviceServices services{pool,
                          systemFiles(),
                          images,
                          movies,
                          power,
                          &access,
                          [this] { return *connections.anonymousListener(*folder); },
                          [](const AuditToken&) { return kPhotos; },
                          [] { return Dictionary{}; },
                          [](const std::string&) { return VolumeStatistics{}; }};
  std::shared_ptr<BrivoDevice> device = BrivoDevice::initWithURL(Url::file(card.path()), services);
  DeviceService service{*device, services};
};

TEST_F(DeviceServiceTest, AProcessThatHasTheNumberOfARefusedOneIsDecidedAboutAnew) {
  {
    const Process refused;
    EXPECT_FALSE(isLetIn(refused.token()));
    database.addApplicationWithBundleIdentifier(kPhotos, true);
    EXPECT_FALSE(isLetIn(refused.token())) << "the decision stands for the process";
  }
  const Process successor;
  EXPECT_TRUE(isLetIn(successor.token()));
}

TEST_F(DeviceServiceTest, AProcessThatHasTheNumberOfAnAdmittedOneIsDecidedAboutAnew) {
  database.addApplicationWithBundleIdentifier(kPhotos, true);
  {
    const Process admitted;
    EXPECT_TRUE(isLetIn(admitted.token()));
    EXPECT_FALSE(isLetIn(admitted.token())) << "a process is let in once";
  }
  {
    const Process successor;
    EXPECT_TRUE(isLetIn(successor.token()));
  }
  database.revokeApplicationWithBundleIdentifier(kPhotos);
  const Process last;
  EXPECT_FALSE(isLetIn(last.token()));
}

TEST_F(DeviceServiceTest, NothingIsKeptOfProcessesThatHaveEnded) {
  const AuditToken own = AuditToken::ofThisProcess();
  isLetIn(own);
  int pidfd = -1;
  {
    const Process process;
    const AuditToken token = process.token();
    pidfd = token.pidfd();
    EXPECT_FALSE(isLetIn(token));
  }
  EXPECT_GE(::fcntl(pidfd, F_GETFD), 0) << "it is what tells that the process has ended";
  EXPECT_FALSE(isLetIn(own)) << "which is known, so that no file is opened for it";
  EXPECT_EQ(::fcntl(pidfd, F_GETFD), -1);
}

}  // namespace
}  // namespace brivo
