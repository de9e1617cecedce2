// SPDX-License-Identifier: MIT
#include "imaging/worker.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <functional>

#include "imaging/landlock.h"
#include "imaging/probes.h"
#include "platform/decoding/imaging_service.h"
#include "platform/decoding/sanitized_build.h"
#include "support/open_file.h"

namespace brivo::imaging {
namespace {

using test::fileWith;
using test::probe;
using test::probeNames;

/// Exit status of a child process that runs `body`.
int inChild(const std::function<int()>& body) {
  const pid_t child = ::fork();
  if (child == 0) ::_exit(body());
  int status = -1;
  ::waitpid(child, &status, 0);
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

class WorkerTest : public testing::Test {
 protected:
  std::string answerTo(std::string_view command) {
    const auto answer = service_.thumbnail(fileWith(command), {});
    return answer ? std::string(answer->text()) : "nothing";
  }

  static WorkerOptions options() {
    WorkerOptions options;
    options.program = PROBING_WORKER;
    options.workers = 1;
    return options;
  }

  WorkerPool workers_{options()};
  ImagingService service_{workers_};
};

TEST_F(WorkerTest, NothingIsReachedBeyondWhatItWasHanded) {
  ASSERT_FALSE(probeNames().empty());
  for (const std::string_view name : probeNames()) {
    EXPECT_EQ(answerTo("probe " + std::string(name)), "EPERM") << name;
  }
}

TEST(ProbesTest, ReachEverythingWithoutConfinement) {
  const UniqueFd file = fileWith("content");
  for (const std::string_view name : probeNames()) EXPECT_EQ(probe(name, file.get()), "done") << name;
}

TEST_F(WorkerTest, TheFileItWasHandedIsRead) { EXPECT_EQ(answerTo("some content"), "some content"); }

TEST_F(WorkerTest, TryingWhatNoDecoderWouldTryEndsIt) {
  const std::string before = answerTo("process");
  EXPECT_EQ(answerTo("kill the service"), "nothing");
  EXPECT_NE(answerTo("process"), before);
}

TEST_F(WorkerTest, ResultsCannotGrowBeyondTheLimit) {
  EXPECT_EQ(answerTo("write beyond the limit"), "EFBIG");
  EXPECT_EQ(answerTo("grow beyond the limit"), "EFBIG");
  EXPECT_EQ(answerTo("more than the limit"), "nothing");
}

TEST_F(WorkerTest, AnExceptionCostsItsRequestAlone) {
  const std::string before = answerTo("process");
  EXPECT_EQ(answerTo("throw"), "nothing");
  EXPECT_EQ(answerTo("process"), before);
}

TEST_F(WorkerTest, MemoryThatRunsOutCostsItsRequestAlone) {
  if (kSanitizedBuild) GTEST_SKIP() << "memory has no limit under the sanitizers";
  const std::string before = answerTo("process");
  EXPECT_EQ(answerTo("allocate without end"), "nothing");
  EXPECT_EQ(answerTo("process"), before);
}

TEST_F(WorkerTest, DescriptorsAreClosedAfterEachRequest) {
  const std::string before = answerTo("process");
  for (int i = 0; i < 50; ++i) ASSERT_EQ(answerTo("content"), "content");  // more than it may hold at once
  EXPECT_EQ(answerTo("process"), before);
}

TEST(WorkerProtocolTest, ARequestWithoutDescriptorsEndsTheWorker) {
  const auto body = [] {
    std::array<int, 2> ends{};
    if (::socketpair(AF_UNIX, SOCK_SEQPACKET, 0, ends.data()) != 0) return 2;
    const WorkerRequest request;
    if (::send(ends[0], &request, sizeof request, 0) != ssize_t{sizeof request}) return 3;
    class NoDecoder final : public ImageDecoder {
     public:
      std::optional<Data> thumbnail(const UniqueFd&, const ThumbnailRequest&) override { std::_Exit(4); }
      std::vector<std::uint32_t> imageWidths(const UniqueFd&) override { return {}; }
      std::optional<Image> image(const UniqueFd&, std::uint32_t) override { return std::nullopt; }
    } decoder;
    class NoMovies final : public MovieReader {
     public:
      std::optional<MovieDescription> describe(const UniqueFd&) override { return std::nullopt; }
      std::optional<Data> firstFrame(const UniqueFd&, MaximumSize) override { return std::nullopt; }
    } movies;
    return runWorker(UniqueFd(ends[1]), decoder, movies);
  };
  EXPECT_EQ(inChild(body), 1);
}

TEST(LandlockTest, ClosesTheFileSystemByItself) {
  constexpr int noLandlock = 77;
  const UniqueFd file = fileWith("content");
  const auto body = [&] {
    if (::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) != 0) return 2;
    const auto version = giveUpFileSystem();
    if (!version) return 3;
    if (*version == 0) return noLandlock;
    for (const char* name : {"open", "create", "reopen"}) {
      if (probe(name, file.get()) != "EACCES") return 4;
    }
    char byte = 0;
    return ::pread(file.get(), &byte, 1, 0) == 1 && byte == 'c' ? 0 : 5;
  };
  const int status = inChild(body);
  if (status == noLandlock) GTEST_SKIP() << "this kernel has no Landlock";
  EXPECT_EQ(status, 0);
}

TEST(ImagingProgramTest, SaysThatTheServiceStartsIt) {
  for (const char* how : {" --help 2>&1", " 2>&1 3>&-"}) {
    FILE* const program = ::popen((std::string(BRIVOD_IMAGING_PROGRAM) + how).c_str(), "r");
    ASSERT_NE(program, nullptr);
    char text[1000];
    const std::size_t size = std::fread(text, 1, sizeof text, program);
    EXPECT_EQ(std::string_view(text, size),
              "brivod-imaging decodes pictures and movies for brivod, which starts it; it does nothing by "
              "itself.\n");
    EXPECT_EQ(WEXITSTATUS(::pclose(program)), 2);
  }
}

TEST(ImagingProgramTest, AFileThatIsNoPictureGivesNothingAndLeavesItAlive) {
  std::vector<std::string> lines;
  WorkerOptions options;
  options.program = BRIVOD_IMAGING_PROGRAM;
  options.workers = 1;
  Mutex mutex;
  options.log = [&](std::string_view line) {
    const MutexLock lock(mutex);
    lines.emplace_back(line);
  };
  WorkerPool workers(options);
  ImagingService service(workers);
  for (int i = 0; i < 3; ++i) EXPECT_FALSE(service.thumbnail(fileWith("no picture"), {}));
  EXPECT_TRUE(service.imageWidths(fileWith("no picture")).empty());
  EXPECT_FALSE(service.image(fileWith("no picture"), 0));
  const MutexLock lock(mutex);
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_TRUE(lines.front().starts_with("imaging worker: no new privileges, seccomp, ")) << lines.front();
}

}  // namespace
}  // namespace brivo::imaging
