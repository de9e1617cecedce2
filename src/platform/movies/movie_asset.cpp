// SPDX-License-Identifier: MIT
#include "platform/movies/movie_asset.h"

#include <exception>
#include <utility>

#include "platform/movies/movie_service.h"

namespace brivo {

namespace {

/// What a reading function gives, or nothing when memory runs out on the way.
template <class Read>
auto readOrNothing(Read read) -> decltype(read()) {
  try {
    return read();
  } catch (const std::exception&) {
    return std::nullopt;
  }
}

}  // namespace

MovieAsset::MovieAsset(MakingKey, MovieService& service, UniqueFd file)
    : service_(service), file_(std::move(file)), loaded_(promise_.get_future()) {}

/// A task lets go of the asset, and with it of the file, before anyone hears that it has done its work.
void MovieAsset::startLoading() {
  std::call_once(loading_, [&] {
    service_.valueLane_->post([self = shared_from_this()]() mutable {
      auto description = readOrNothing([&] { return self->service_.reader_.describe(self->file_); });
      std::promise<Description> promise = std::move(self->promise_);
      self.reset();
      promise.set_value(std::move(description));
    });
  });
}

const MovieAsset::Description& MovieAsset::description() {
  startLoading();
  return loaded_.get();
}

void MovieAsset::loadValuesAsynchronously(std::function<void()> completion) {
  startLoading();
  // Behind the loading in the order of the lane, so this waits for one that runs already.
  service_.valueLane_->post([self = shared_from_this(), completion = std::move(completion)]() mutable {
    self->loaded_.wait();
    self.reset();
    completion();
  });
}

const std::vector<VideoTrack>& MovieAsset::videoTracks() {
  static const std::vector<VideoTrack> none;
  return description() ? description()->videoTracks : none;
}

const std::vector<MovieMetadataItem>& MovieAsset::commonMetadata() {
  static const std::vector<MovieMetadataItem> none;
  return description() ? description()->metadata : none;
}

void MovieAsset::generateFirstFrameAsynchronously(MaximumSize maximum,
                                                  std::function<void(std::optional<Data>)> completion) {
  service_.frameLane_->post(
      [self = shared_from_this(), maximum, completion = std::move(completion)]() mutable {
        auto frame = readOrNothing([&] { return self->service_.reader_.firstFrame(self->file_, maximum); });
        self.reset();
        completion(std::move(frame));
      });
}

}  // namespace brivo
