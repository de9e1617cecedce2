// SPDX-License-Identifier: MIT
#include "brivoctl/thumbnail_stream.h"

#include <condition_variable>
#include <deque>
#include <mutex>

namespace brivoctl {

/// Answers from the library's threads, for one that waits. *Thread-safe.*
class ThumbnailStream::Arrivals {
 public:
  void add(Answer answer) {
    const std::lock_guard lock(mutex_);
    answers_.push_back(std::move(answer));
    arrived_.notify_one();
  }

  Answer take() {
    std::unique_lock lock(mutex_);
    arrived_.wait(lock, [&] { return !answers_.empty(); });
    Answer answer = std::move(answers_.front());
    answers_.pop_front();
    return answer;
  }

 private:
  std::mutex mutex_;
  std::condition_variable arrived_;
  std::deque<Answer> answers_;
};

ThumbnailStream::ThumbnailStream(const std::vector<orvid::Object>& objects, std::uint32_t maximumPixelSize,
                                 orvid::Timeout timeout)
    : objects_(objects),
      maximumPixelSize_(maximumPixelSize),
      timeout_(timeout),
      arrivals_(std::make_shared<Arrivals>()) {}

std::optional<ThumbnailStream::Answer> ThumbnailStream::next() {
  while (asked_ < objects_.size() && asked_ - given_ < kOutstanding) ask();
  if (given_ == asked_) return std::nullopt;
  ++given_;
  return arrivals_->take();
}

void ThumbnailStream::ask() {
  const std::size_t index = asked_++;
  objects_[index].thumbnailAsync(
      maximumPixelSize_,
      [arrivals = arrivals_, index](orvid::Result<orvid::Dictionary> reply) {
        arrivals->add({index, std::move(reply)});
      },
      timeout_);
}

}  // namespace brivoctl
