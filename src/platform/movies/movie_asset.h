// SPDX-License-Identifier: MIT
#pragma once

#include <functional>
#include <future>
#include <memory>
#include <mutex>
#include <optional>
#include <vector>

#include "platform/base/mutex.h"
#include "platform/movies/movie_reader.h"

namespace brivo {

class MovieService;

/// One movie file and what is known of it. Its values are loaded once, on a thread of the service: in advance
/// when loadValuesAsynchronously() is called, else by whoever asks first and waits for it. Keeps the file
/// open. *Thread-safe.*
class MovieAsset : public std::enable_shared_from_this<MovieAsset> {
  struct MakingKey {};

 public:
  enum class ValueStatus { loaded, failed };

  /// Only for MovieService.
  MovieAsset(MakingKey, MovieService& service, UniqueFd file);

  /// Calls `completion` when the values below can be had without waiting, on a thread of the service. Always,
  /// whatever becomes of the file and of who reads it, and without waiting for other movies when they have
  /// been loaded.
  void loadValuesAsynchronously(std::function<void()> completion);

  ValueStatus statusOfDuration() { return description() && description()->duration ? kLoaded : kFailed; }
  /// Seconds; 0 unless it has been loaded.
  double duration() { return description() ? description()->duration.value_or(0) : 0; }
  ValueStatus statusOfTracks() { return description() ? kLoaded : kFailed; }
  /// In the order of the container; empty unless they have been loaded. As long as this lives.
  const std::vector<VideoTrack>& videoTracks();
  /// Likewise.
  const std::vector<MovieMetadataItem>& commonMetadata();

  /// Has the picture at time zero made, as MovieReader::firstFrame() says, and hands it to `completion` on a
  /// thread of the service. Always, with none when there is no picture.
  void generateFirstFrameAsynchronously(MaximumSize maximum,
                                        std::function<void(std::optional<Data>)> completion);

 private:
  friend class MovieService;
  using Description = std::optional<MovieDescription>;
  static constexpr auto kLoaded = ValueStatus::loaded;
  static constexpr auto kFailed = ValueStatus::failed;

  using Completion = std::function<void()>;

  void startLoading();
  /// On a thread of the service. Lets go of `self`, and with it of the file, before anyone hears of the end.
  static void load(std::shared_ptr<MovieAsset> self);
  /// False when the loading has ended, and nobody would call it.
  bool willCall(Completion& completion) BRIVO_EXCLUDES(mutex_);
  /// Whom to call; from then on there is nobody.
  std::vector<Completion> endLoading() BRIVO_EXCLUDES(mutex_);
  const Description& description();

  MovieService& service_;
  const UniqueFd file_;
  std::once_flag loading_;
  std::promise<Description> promise_;
  const std::shared_future<Description> loaded_;
  Mutex mutex_;
  bool hasEnded_ BRIVO_GUARDED_BY(mutex_) = false;
  std::vector<Completion> completions_ BRIVO_GUARDED_BY(mutex_);
};

}  // namespace brivo
