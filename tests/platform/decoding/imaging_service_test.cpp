// SPDX-License-Identifier: MIT
#include "platform/decoding/imaging_service.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <random>
#include <thread>

#include "platform/decoding/worker_program.h"
#include "support/command_pipe.h"
#include "support/open_file.h"
#include "support/processes.h"
#include "support/raw_dbus.h"
#include "support/wait.h"

namespace brivo {
namespace {

using std::chrono::seconds;
using test::childrenOf;
using test::CommandPipe;
using test::fileWith;
using test::openDescriptorCount;
using test::waitUntil;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::StartsWith;
using Clock = std::chrono::steady_clock;

/// What was logged, from any thread.
class Lines {
 public:
  std::function<void(std::string_view)> sink() {
    return [this](std::string_view line) {
      const MutexLock lock(mutex_);
      lines_.emplace_back(line);
    };
  }
  std::vector<std::string> all() const {
    const MutexLock lock(mutex_);
    return lines_;
  }

 private:
  mutable Mutex mutex_;
  std::vector<std::string> lines_ BRIVO_GUARDED_BY(mutex_);
};

WorkerOptions probingWorkers(std::size_t count = 2) {
  WorkerOptions options;
  options.program = PROBING_WORKER;
  options.workers = count;
  return options;
}

std::string answerTo(ImagingService& service, std::string_view command) {
  const auto answer = service.thumbnail(fileWith(command), {});
  return answer ? std::string(answer->text()) : "nothing";
}

TEST(ImagingServiceTest, ARequestReachesTheDecoderAsItIs) {
  WorkerPool workers(probingWorkers());
  ImagingService service(workers);
  const UniqueFd file = fileWith("request");
  const auto answer = [&](const ThumbnailRequest& request) {
    return std::string(service.thumbnail(file, request).value_or(Data()).text());
  };
  EXPECT_EQ(answer({160, ThumbnailSource::embedded, 100}), "160 0 100");
  EXPECT_EQ(answer({0, ThumbnailSource::full, std::nullopt}), "0 2 any");
  EXPECT_EQ(answer({1024, ThumbnailSource::embeddedElseFull, 0}), "1024 1 0");
}

TEST(ImagingServiceTest, WidthsAndPixelsComeBack) {
  WorkerPool workers(probingWorkers());
  ImagingService service(workers);
  EXPECT_THAT(service.imageWidths(fileWith("two images")), ElementsAre(6000, 160));
  EXPECT_THAT(service.imageWidths(fileWith("none")), IsEmpty());
  const auto image = service.image(fileWith("any"), 1);
  ASSERT_TRUE(image);
  EXPECT_EQ(image->width, 3U);
  EXPECT_EQ(image->height, 2U);
  EXPECT_EQ(image->bytesPerPixel, 4U);
  EXPECT_EQ(image->pixels.text(), std::string(24, 'b'));
  EXPECT_FALSE(service.image(fileWith("any"), 2));
  EXPECT_FALSE(service.image(fileWith("incomplete"), 0)) << "its pixels are not those of its size";
}

TEST(ImagingServiceTest, AnAnswerIsAMemoryFileThatNobodyCanChange) {
  WorkerPool workers(probingWorkers());
  ImagingService service(workers);
  const auto answer = service.thumbnail(fileWith("content"), {});
  ASSERT_TRUE(answer);
  ASSERT_GE(answer->memfd(), 0);
  constexpr int seals = F_SEAL_SHRINK | F_SEAL_GROW | F_SEAL_WRITE | F_SEAL_SEAL;
  EXPECT_EQ(::fcntl(answer->memfd(), F_GET_SEALS) & seals, seals);
}

TEST(ImagingServiceTest, AFileThatIsOpenForWritingIsNotHandedOver) {
  WorkerPool workers(probingWorkers());
  ImagingService service(workers);
  const test::TemporaryFolder folder;
  test::writeFile(folder / "file", "content");
  const UniqueFd writable(::open((folder / "file").c_str(), O_RDWR | O_CLOEXEC));
  EXPECT_FALSE(service.thumbnail(writable, {}));
  EXPECT_FALSE(service.thumbnail(UniqueFd(), {}));
  EXPECT_EQ(answerTo(service, "content"), "content");
}

TEST(ImagingServiceTest, TheFirstWorkerIsThereBeforeItIsNeededAndSaysHowItIsConfined) {
  Lines lines;
  WorkerOptions options = probingWorkers();
  options.log = lines.sink();
  WorkerPool workers(options);
  ImagingService service(workers);
  EXPECT_TRUE(waitUntil([&] { return !lines.all().empty(); }));
  EXPECT_EQ(childrenOf(::getpid()).size(), 1U);
  EXPECT_EQ(answerTo(service, "content"), "content");
  EXPECT_THAT(lines.all(), ElementsAre(StartsWith("imaging worker: no new privileges, seccomp, ")));
}

class FaultTest : public testing::TestWithParam<const char*> {};

TEST_P(FaultTest, CostsOneRequestAndNothingElse) {
  WorkerOptions options = probingWorkers(1);
  options.budget = seconds(5);
  WorkerPool workers(options);
  ImagingService service(workers);
  const std::string before = answerTo(service, "process");
  EXPECT_EQ(answerTo(service, GetParam()), "nothing");
  const std::string after = answerTo(service, "process");
  EXPECT_NE(after, "nothing");
  EXPECT_NE(after, before);
}

INSTANTIATE_TEST_SUITE_P(ImagingServiceTest, FaultTest,
                         testing::Values("hang", "crash", "touch beyond the end", "exit", "abort",
                                         "say garbage", "claim more", "say an unknown status",
                                         "keep a mapping"));

TEST(ImagingServiceTest, AnAnswerThatNobodyAskedForIsNotTakenForTheNext) {
  WorkerPool workers(probingWorkers(1));
  ImagingService service(workers);
  EXPECT_EQ(answerTo(service, "reply twice"), "nothing");
  EXPECT_THAT(answerTo(service, "next"), testing::AnyOf("next", "nothing"));
  for (int i = 0; i < 3; ++i) EXPECT_EQ(answerTo(service, "next"), "next");
}

TEST(ImagingServiceTest, AHangingNeighbourHoldsUpNobody) {
  WorkerPool workers(probingWorkers(2));
  ImagingService service(workers);
  const CommandPipe hanging("hang");
  std::thread neighbour([&] { EXPECT_FALSE(service.thumbnail(hanging.file(), {})); });
  EXPECT_TRUE(waitUntil([&] { return hanging.isTaken(); }));
  const std::string other = answerTo(service, "process");
  EXPECT_NE(other, "nothing");
  for (const pid_t child : childrenOf(::getpid())) {
    if (std::to_string(child) != other) ::kill(child, SIGKILL);
  }
  neighbour.join();
}

TEST(ImagingServiceTest, AWorkerThatWasKilledWhileIdleCostsNothing) {
  WorkerPool workers(probingWorkers(2));
  ImagingService service(workers);
  for (int i = 0; i < 20; ++i) {
    const std::string process = answerTo(service, "process");
    ASSERT_EQ(::kill(std::stoi(process), SIGKILL), 0);
    ASSERT_EQ(answerTo(service, "content"), "content");  // whether or not it is dead yet
  }
}

TEST(ImagingServiceTest, CallersWaitForAFreeWorker) {
  WorkerPool workers(probingWorkers(1));
  ImagingService service(workers);
  std::vector<std::thread> callers;
  std::atomic<int> answered = 0;
  for (int i = 0; i < 4; ++i) {
    callers.emplace_back([&] {
      for (int request = 0; request < 25; ++request)
        answered += answerTo(service, "work") == "worked" ? 1 : 0;
    });
  }
  for (std::thread& caller : callers) caller.join();
  EXPECT_EQ(answered, 100);
  EXPECT_EQ(childrenOf(::getpid()).size(), 1U);
}

TEST(ImagingServiceTest, AWorkerIsReplacedAfterSoManyFiles) {
  WorkerOptions options = probingWorkers(1);
  options.filesPerWorker = 3;
  WorkerPool workers(options);
  ImagingService service(workers);
  std::vector<std::string> processes;
  for (int i = 0; i < 9; ++i) processes.push_back(answerTo(service, "process"));
  EXPECT_THAT(processes, testing::Not(testing::Contains("nothing")));
  for (std::size_t i = 1; i < processes.size(); ++i) {
    EXPECT_EQ(processes[i] == processes[i - 1], i % 3 != 0) << i;
  }
  EXPECT_TRUE(waitUntil([] { return childrenOf(::getpid()).size() == 1; })) << "the old ones are reaped";
}

TEST(ImagingServiceTest, RandomKillsCostTheirRequestsAtMost) {
  const std::size_t descriptors = openDescriptorCount();
  {
    WorkerPool workers(probingWorkers(2));
    ImagingService service(workers);
    std::atomic<int> pictures = 0;
    std::atomic<int> answers = 0;
    std::atomic<bool> ending = false;
    std::atomic<int> kills = 0;
    std::thread killer([&] {
      std::minstd_rand random(7);
      while (!ending) {
        const auto children = childrenOf(::getpid());
        if (!children.empty()) kills += ::kill(children[random() % children.size()], SIGKILL) == 0 ? 1 : 0;
        const int next = answers + static_cast<int>(random() % 20);
        waitUntil([&] { return ending || answers >= next; });
      }
    });
    std::vector<std::thread> callers;
    for (int i = 0; i < 2; ++i) {
      callers.emplace_back([&] {
        const UniqueFd file = fileWith("work");
        for (int request = 0; request < 500; ++request, ++answers) {
          const auto picture = service.thumbnail(file, {});
          if (!picture) continue;
          EXPECT_EQ(picture->text(), "worked");
          ++pictures;
        }
      });
    }
    for (std::thread& caller : callers) caller.join();
    ending = true;
    killer.join();
    EXPECT_EQ(answers, 1000);
    EXPECT_GT(pictures, 0);
    EXPECT_GT(kills, 10);
    for (int i = 0; i < 10; ++i) EXPECT_EQ(answerTo(service, "content"), "content");
    EXPECT_TRUE(waitUntil([] { return childrenOf(::getpid()).size() <= 2; }));
  }
  EXPECT_THAT(childrenOf(::getpid()), IsEmpty());
  EXPECT_EQ(openDescriptorCount(), descriptors);
}

TEST(ImagingServiceTest, NeitherDescriptorsNorProcessesAreLeft) {
  const std::size_t descriptors = openDescriptorCount();
  for (int i = 0; i < 3; ++i) {
    WorkerOptions options = probingWorkers(2);
    options.filesPerWorker = 2;
    WorkerPool workers(options);
    ImagingService service(workers);
    for (const char* command : {"content", "crash", "content", "keep a mapping", "", "content"}) {
      (void)answerTo(service, command);
    }
  }
  EXPECT_THAT(childrenOf(::getpid()), IsEmpty());
  EXPECT_EQ(openDescriptorCount(), descriptors);
}

/// Requests yield nothing at once, and one line says why.
void expectNoPictures(const std::string& program) {
  Lines lines;
  WorkerOptions options = probingWorkers();
  options.program = program;
  options.log = lines.sink();
  WorkerPool workers(options);
  ImagingService service(workers);
  const auto start = Clock::now();
  for (int i = 0; i < 10; ++i) EXPECT_EQ(answerTo(service, "content"), "nothing");
  EXPECT_LT(Clock::now() - start, seconds(5));
  ASSERT_EQ(lines.all().size(), 1U);
  EXPECT_NE(lines.all().front().find(program), std::string::npos) << lines.all().front();
}

TEST(ImagingServiceTest, AMissingProgramYieldsNothingAtOnce) { expectNoPictures("/nowhere/brivod-imaging"); }

TEST(ImagingServiceTest, AProgramThatIsNoWorkerYieldsNothingAtOnce) { expectNoPictures("/bin/false"); }

TEST(ImagingServiceTest, ItEndsSoonWhileAWorkerHangsAndOthersWait) {
  auto owner = std::make_unique<WorkerPool>(probingWorkers(1));
  ImagingService service(*owner);
  const CommandPipe hanging("hang");
  std::thread caller([&] { EXPECT_FALSE(service.thumbnail(hanging.file(), {})); });
  ASSERT_TRUE(waitUntil([&] { return hanging.isTaken(); }));
  const UniqueFd file = fileWith("content");
  std::atomic<pid_t> waiting = 0;
  std::thread waiter([&] {
    waiting = ::gettid();
    EXPECT_FALSE(service.thumbnail(file, {}));
  });
  ASSERT_TRUE(waitUntil([&] { return waiting != 0 && test::isBlocked(waiting); }));
  const auto start = Clock::now();
  owner.reset();
  EXPECT_LT(Clock::now() - start, seconds(5));
  caller.join();
  waiter.join();
  EXPECT_THAT(childrenOf(::getpid()), IsEmpty());
}

TEST(ImagingServiceTest, AHangingWorkerDoesNotOutliveAServiceThatIsKilled) {
  const CommandPipe hanging("hang");
  const pid_t host = ::fork();
  if (host == 0) {
    ::prctl(PR_SET_PDEATHSIG, SIGKILL);
    WorkerPool workers(probingWorkers(1));
    ImagingService service(workers);
    (void)service.thumbnail(hanging.file(), {});
    ::_exit(0);
  }
  ASSERT_TRUE(waitUntil([&] { return hanging.isTaken(); }));
  const auto workers = childrenOf(host);
  ASSERT_EQ(workers.size(), 1U);
  ::kill(host, SIGKILL);
  ::waitpid(host, nullptr, 0);
  EXPECT_TRUE(waitUntil([&] { return !test::isRunning(workers.front()); }));
}

TEST(WorkerProgramTest, IsTheInstalledOneWhereNoneLiesBesideTheProgram) {
  EXPECT_THAT(installedWorkerProgram(), testing::MatchesRegex("/.*/brivod/brivod-imaging"));
}

}  // namespace
}  // namespace brivo
