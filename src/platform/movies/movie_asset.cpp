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

void MovieAsset::startLoading() {
  std::call_once(loading_, [&] {
    service_.valueLane_->post([self = shared_from_this()]() mutable { load(std::move(self)); });
  });
}

void MovieAsset::load(std::shared_ptr<MovieAsset> self) {
  auto description = readOrNothing([&] { return self->service_.reader_.describe(self->file_); });
  std::promise<Description> promise = std::move(self->promise_);
  const std::vector<Completion> completions = self->endLoading();
  self.reset();
  promise.set_value(std::move(description));
  for (const Completion& complete : completions) complete();
}

std::vector<MovieAsset::Completion> MovieAsset::endLoading() {
  const MutexLock lock(mutex_);
  hasEnded_ = true;
  return std::exchange(completions_, {});
}

bool MovieAsset::willCall(Completion& completion) {
  const MutexLock lock(mutex_);
  if (!hasEnded_) completions_.push_back(std::move(completion));
  return !hasEnded_;
}

const MovieAsset::Description& MovieAsset::description() {
  startLoading();
  return loaded_.get();
}

void MovieAsset::loadValuesAsynchronously(std::function<void()> completion) {
  startLoading();
  if (willCall(completion)) return;
  // Not in the lane, where it would be behind the loading of others.
  service_.threads_.post([self = shared_from_this(), completion = std::move(completion)]() mutable {
    self->loaded_.wait();  // the end of the loading is known a moment before the values are there
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
