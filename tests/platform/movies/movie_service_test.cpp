// SPDX-License-Identifier: MIT
#include "platform/movies/movie_service.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <atomic>
#include <future>
#include <latch>
#include <new>
#include <thread>

#include "platform/decoding/worker_pool.h"
#include "platform/movies/worker_movie_reader.h"
#include "support/command_pipe.h"
#include "support/open_file.h"
#include "support/processes.h"
#include "support/raw_dbus.h"
#include "support/wait.h"

namespace brivo {
namespace {

using std::chrono::seconds;
using test::fileWith;
using test::openDescriptorCount;
using Status = MovieAsset::ValueStatus;

/// Says what it is told to say, when it is told to.
class ScriptedReader final : public MovieReader {
 public:
  std::optional<MovieDescription> describe(const UniqueFd&) override {
    ++describing;
    mayDescribe.wait();
    if (throws) throw std::bad_alloc();
    return description;
  }
  std::optional<Data> firstFrame(const UniqueFd&, MaximumSize maximum) override {
    asked = maximum;
    if (throws) throw std::bad_alloc();
    return frame;
  }

  std::latch mayDescribe{0};
  std::atomic<int> describing = 0;
  std::optional<MovieDescription> description = MovieDescription{};
  std::optional<Data> frame;
  bool throws = false;
  MaximumSize asked;
};

/// Waits until the values are there.
void load(MovieAsset& asset) {
  std::promise<void> loaded;
  asset.loadValuesAsynchronously([&] { loaded.set_value(); });
  loaded.get_future().wait();
}

std::optional<Data> frameOf(MovieAsset& asset, MaximumSize maximum = {}) {
  std::promise<std::optional<Data>> frame;
  asset.generateFirstFrameAsynchronously(maximum, [&](std::optional<Data> made) { frame.set_value(made); });
  return frame.get_future().get();
}

class MovieServiceTest : public testing::Test {
 protected:
  ScriptedReader reader;
  MovieService service{reader, 1, 1};
};

TEST_F(MovieServiceTest, OfNoFileThereIsNoAsset) { EXPECT_EQ(service.open(UniqueFd()), nullptr); }

TEST_F(MovieServiceTest, TheValuesAreWhatTheReaderSays) {
  reader.description->duration = 2.5;
  reader.description->videoTracks.resize(2);
  reader.description->metadata = {{"make", "A Maker"}};
  const auto asset = service.open(fileWith("movie"));
  load(*asset);
  EXPECT_EQ(asset->statusOfDuration(), Status::loaded);
  EXPECT_EQ(asset->duration(), 2.5);
  EXPECT_EQ(asset->statusOfTracks(), Status::loaded);
  EXPECT_EQ(asset->videoTracks().size(), 2u);
  EXPECT_EQ(asset->commonMetadata().at(0).value, "A Maker");
}

TEST_F(MovieServiceTest, EachValueHasAStatusOfItsOwn) {
  const auto asset = service.open(fileWith("movie"));
  load(*asset);
  EXPECT_EQ(asset->statusOfDuration(), Status::failed);
  EXPECT_EQ(asset->statusOfTracks(), Status::loaded);
}

TEST_F(MovieServiceTest, OfWhatIsNoMovieNoValueIsLoaded) {
  reader.description.reset();
  const auto asset = service.open(fileWith("movie"));
  load(*asset);
  EXPECT_EQ(asset->statusOfDuration(), Status::failed);
  EXPECT_EQ(asset->statusOfTracks(), Status::failed);
  EXPECT_EQ(asset->duration(), 0);
  EXPECT_TRUE(asset->videoTracks().empty());
  EXPECT_TRUE(asset->commonMetadata().empty());
}

TEST_F(MovieServiceTest, ValuesThatNobodyLoadedAreWaitedFor) {
  reader.description->videoTracks.resize(3);
  EXPECT_EQ(service.open(fileWith("movie"))->videoTracks().size(), 3u);
}

TEST_F(MovieServiceTest, AMovieIsReadOnceHoweverManyAsk) {
  const auto asset = service.open(fileWith("movie"));
  (void)asset->videoTracks();
  load(*asset);
  load(*asset);
  EXPECT_EQ(reader.describing, 1);
}

TEST_F(MovieServiceTest, TheCompletionRunsOnAThreadOfTheService) {
  const auto asset = service.open(fileWith("movie"));
  std::promise<std::thread::id> thread;
  asset->loadValuesAsynchronously([&] { thread.set_value(std::this_thread::get_id()); });
  EXPECT_NE(thread.get_future().get(), std::this_thread::get_id());
}

TEST_F(MovieServiceTest, AFrameHasTheBoundsOfItsRequest) {
  reader.frame = Data::copyOf("a picture");
  const auto frame = frameOf(*service.open(fileWith("movie")), {160, 12'960});
  ASSERT_TRUE(frame);
  EXPECT_EQ(frame->text(), "a picture");
  EXPECT_EQ(reader.asked.width, 160u);
  EXPECT_EQ(reader.asked.height, 12'960u);
}

TEST_F(MovieServiceTest, ItCompletesWhenMemoryRunsOut) {
  reader.throws = true;
  const auto asset = service.open(fileWith("movie"));
  load(*asset);
  EXPECT_EQ(asset->statusOfTracks(), Status::failed);
  EXPECT_FALSE(frameOf(*asset));
}

TEST_F(MovieServiceTest, NoDescriptorIsLeftWhenTheCallerHearsOfTheEnd) {
  const std::size_t before = openDescriptorCount();
  for (int i = 0; i < 100; ++i) {
    load(*service.open(fileWith("movie")));
    ASSERT_EQ(openDescriptorCount(), before) << i;
    (void)frameOf(*service.open(fileWith("movie")));
    ASSERT_EQ(openDescriptorCount(), before) << i;
  }
}

/// Of the file "slow" it says nothing until it may.
class SlowReader final : public MovieReader {
 public:
  std::optional<MovieDescription> describe(const UniqueFd& file) override {
    char first = 0;
    if (::pread(file.get(), &first, 1, 0) == 1 && first == 's') maySay.wait();
    return MovieDescription();
  }
  std::optional<Data> firstFrame(const UniqueFd&, MaximumSize) override { return std::nullopt; }
  std::latch maySay{1};
};

class LoadedMovieTest : public testing::Test {
 protected:
  ~LoadedMovieTest() override {
    reader.maySay.count_down();
    load(*slow);
  }
  SlowReader reader;
  std::promise<void> completed;
  MovieService service{reader, 1, 1};
  const std::shared_ptr<MovieAsset> slow = service.open(fileWith("slow"));
  const std::shared_ptr<MovieAsset> quick = service.open(fileWith("quick"));
};

TEST_F(LoadedMovieTest, ItsCompletionDoesNotWaitForTheLoadingOfOthers) {
  (void)quick->videoTracks();
  slow->loadValuesAsynchronously([] {});
  quick->loadValuesAsynchronously([&] { completed.set_value(); });
  EXPECT_EQ(completed.get_future().wait_for(seconds(5)), std::future_status::ready);
}

TEST_F(LoadedMovieTest, CompletionsRunWhereTheLoadingEnds) {
  std::promise<void> mayEnd;
  const auto first = service.open(fileWith("first"));
  first->loadValuesAsynchronously([isTime = mayEnd.get_future().share()] { isTime.wait(); });
  quick->loadValuesAsynchronously([] {});
  slow->loadValuesAsynchronously([] {});
  quick->loadValuesAsynchronously([&] { completed.set_value(); });  // asked for behind the slow one
  mayEnd.set_value();
  EXPECT_EQ(completed.get_future().wait_for(seconds(5)), std::future_status::ready);
}

TEST_F(LoadedMovieTest, EveryCompletionRunsOnceHoweverTheyMeetTheEnd) {
  constexpr int rounds = 300;
  constexpr int asking = 4;
  for (int round = 0; round < rounds; ++round) {
    const auto asset = service.open(fileWith("quick"));
    std::atomic<int> calls = 0;
    std::latch called(asking);
    std::vector<std::thread> threads;
    for (int i = 0; i < asking; ++i) {
      threads.emplace_back([&] {
        asset->loadValuesAsynchronously([&] {
          if (asset->statusOfTracks() == Status::loaded) ++calls;
          called.count_down();
        });
      });
    }
    for (std::thread& thread : threads) thread.join();
    called.wait();
    ASSERT_EQ(calls, asking);
  }
}

TEST(MovieServiceThreadsTest, AFrameDoesNotWaitForValues) {
  struct Waiting final : MovieReader {
    std::optional<MovieDescription> describe(const UniqueFd&) override {
      done.wait();
      return std::nullopt;
    }
    std::optional<Data> firstFrame(const UniqueFd&, MaximumSize) override { return Data::copyOf("frame"); }
    std::latch done{1};
  } reader;
  MovieService service(reader, 1, 1);
  std::vector<std::shared_ptr<MovieAsset>> card;
  std::latch loaded(500);
  for (int i = 0; i < 500; ++i) {
    card.push_back(service.open(fileWith("movie")));
    card.back()->loadValuesAsynchronously([&] { loaded.count_down(); });
  }
  EXPECT_TRUE(frameOf(*card.front()));
  reader.done.count_down();
  loaded.wait();
}

class MovieWorkersTest : public testing::Test {
 protected:
  static WorkerOptions options() {
    WorkerOptions options;
    options.program = PROBING_WORKER;
    options.workers = 2;
    options.budget = seconds(5);
    return options;
  }
  std::string answerTo(std::string_view command) {
    const auto asset = service.open(fileWith(command));
    load(*asset);
    return asset->commonMetadata().empty() ? "nothing" : asset->commonMetadata().front().value;
  }

  WorkerPool workers{options()};
  WorkerMovieReader reader{workers};
  MovieService service{reader, 1, 2};
};

TEST_F(MovieWorkersTest, AWorkerReadsTheMovie) {
  EXPECT_EQ(answerTo("some content"), "some content");
  const auto frame = frameOf(*service.open(fileWith("movie")), {160, 90});
  ASSERT_TRUE(frame);
  EXPECT_EQ(frame->text(), "160 by 90");
}

TEST_F(MovieWorkersTest, EveryRequestEndsWhateverTheFileDoesToTheWorker) {
  for (const char* command : {"kill the service", "hang", "throw", "exit"}) {
    EXPECT_EQ(answerTo(command), "nothing") << command;
    EXPECT_EQ(answerTo("some content"), "some content") << command;
  }
}

TEST_F(MovieWorkersTest, MoviesThatAreAskedForAtOnceAllComeBack) {
  std::latch loaded(200);
  std::atomic<int> read = 0;
  for (int i = 0; i < 200; ++i) {
    const auto asset = service.open(fileWith("content"));
    asset->loadValuesAsynchronously([&loaded, &read, keep = asset]() mutable {
      if (keep->statusOfTracks() == Status::loaded) ++read;
      keep.reset();
      loaded.count_down();
    });
  }
  loaded.wait();
  EXPECT_EQ(read, 200);
}

TEST(MovieWorkersThatHangTest, AHangingMovieHoldsUpNoFrame) {
  WorkerOptions options;
  options.program = PROBING_WORKER;
  options.workers = 2;
  WorkerPool workers(options);
  WorkerMovieReader reader(workers);
  MovieService service(reader, 1, 1);
  const test::CommandPipe command("hang");
  const auto hanging = service.open(UniqueFd(::dup(command.file().get())));
  std::promise<void> loaded;
  hanging->loadValuesAsynchronously([&] { loaded.set_value(); });
  auto end = loaded.get_future();
  EXPECT_TRUE(test::waitUntil([&] { return command.isTaken(); }));
  EXPECT_TRUE(frameOf(*service.open(fileWith("movie"))));
  EXPECT_EQ(end.wait_for(seconds(0)), std::future_status::timeout);
  for (const pid_t worker : test::childrenOf(::getpid())) ::kill(worker, SIGKILL);
  end.wait();
}

TEST_F(MovieWorkersTest, EveryFrameEndsWhateverTheFileDoesToTheWorker) {
  for (const char* command : {"crash", "hang", "throw", "exit", "say garbage"}) {
    EXPECT_FALSE(frameOf(*service.open(fileWith(command)))) << command;
    const auto frame = frameOf(*service.open(fileWith("movie")), {160, 90});
    ASSERT_TRUE(frame) << command;
    EXPECT_EQ(frame->text(), "160 by 90") << command;
  }
}

}  // namespace
}  // namespace brivo
