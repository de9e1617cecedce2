// SPDX-License-Identifier: MIT
#include "orvidcore/object.h"

#include "orvidcore/piece_stream.h"
#include "orvidcore/saved_file.h"
#include "orvidcore/session.h"
#include "protocol/keys.h"
#include "protocol/result_codes.h"
#include "protocol/selectors.h"

namespace orvid {

namespace keys = brivo::keys;
namespace selectors = brivo::selectors;

namespace {

/// How much of what an earlier try saved is compared with the card before it is gone on with, in bytes.
constexpr std::uint64_t kCompared = 65'536;

Dictionary thumbnailOptions(std::uint32_t maximumPixelSize) {
  Dictionary options;
  options.set(keys::kThumbnailMaxPixelSize, maximumPixelSize);
  return options;
}

}  // namespace

Result<Dictionary> Object::metadata(Timeout timeout) const {
  return blocking<Dictionary>([&](auto handler) {
    session_->request(selectors::kRequestMetadata, info_.handle, {}, timeout, std::move(handler));
  });
}

void Object::metadataAsync(Callback<Dictionary> done, Timeout timeout) const {
  session_->request(selectors::kRequestMetadata, info_.handle, {}, timeout,
                    session_->onEventQueue(std::move(done)));
}

Result<Dictionary> Object::thumbnail(std::uint32_t maximumPixelSize, Timeout timeout) const {
  return blocking<Dictionary>([&](auto handler) {
    session_->request(selectors::kRequestThumbnail, info_.handle, thumbnailOptions(maximumPixelSize), timeout,
                      std::move(handler));
  });
}

void Object::thumbnailAsync(std::uint32_t maximumPixelSize, Callback<Dictionary> done,
                            Timeout timeout) const {
  session_->request(selectors::kRequestThumbnail, info_.handle, thumbnailOptions(maximumPixelSize), timeout,
                    session_->onEventQueue(std::move(done)));
}

Result<Data> Object::read(std::uint64_t offset, std::uint64_t length, Timeout timeout) const {
  return blocking<Data>([&](auto handler) {
    requestRange(*session_, info_.handle, offset, length, timeout, std::move(handler));
  });
}

void Object::readAsync(std::uint64_t offset, std::uint64_t length, Callback<Data> done,
                       Timeout timeout) const {
  requestRange(*session_, info_.handle, offset, length, timeout, session_->onEventQueue(std::move(done)));
}

Result<Done> Object::stream(std::uint64_t offset, const PieceHandler& handler, Timeout timeout) const {
  if (offset > info_.size) return Error{ErrorKind::request, brivo::kResultBadRange, "beyond the end"};
  return PieceStream(*session_, info_, timeout).run(offset, handler);
}

Result<Done> Object::fill(SavedFile& file, const Progress& progress, Timeout timeout) const {
  if (file.size() > 0) {
    const auto saved = file.tail(kCompared);
    if (!saved.ok()) return saved.error();
    const auto now = read(file.size() - saved->size(), saved->size(), timeout);
    if (!now.ok()) return now.error();
    if (!(*now == *saved)) {
      if (auto emptied = file.startOver(); !emptied.ok()) return emptied;
    }
  }
  Result<Done> result = Done();
  auto read = stream(
      file.size(),
      [&](std::span<const std::byte> piece) {
        result = file.append(piece);
        if (result.ok() && progress && !progress(file.size(), info_.size))
          result = Error{ErrorKind::file, 0, "saving was stopped"};
        return result.ok();
      },
      timeout);
  if (!result.ok()) return result;
  if (!read.ok()) return read;
  return file.commit(info_.size);
}

Result<Done> Object::save(const std::string& path, const Progress& progress, Timeout timeout) const {
  auto file = SavedFile::open(path, info_);
  if (!file.ok()) return file.error();
  auto result = fill(*file, progress, timeout);
  if (!result.ok()) file->giveUp(result.error());
  return result;
}

void Object::saveAsync(std::string path, Callback<Done> done, Progress progress, Timeout timeout) const {
  session_->runInBackground([self = *this, path = std::move(path),
                             done = session_->onEventQueue(std::move(done)), progress = std::move(progress),
                             timeout] { done(self.save(path, progress, timeout)); });
}

namespace {

Callback<Dictionary> forgetting(const std::shared_ptr<Session>& session, std::uint32_t handle,
                                Callback<Done> done) {
  return [session, handle, done = std::move(done)](const Result<Dictionary>& result) {
    if (!result.ok()) return done(result.error());
    session->catalogue().remove(handle);
    done(Done());
  };
}

}  // namespace

Result<Done> Object::remove(Timeout timeout) const {
  return blocking<Done>([&](auto handler) {
    session_->request(selectors::kRequestDelete, info_.handle, {}, timeout,
                      forgetting(session_, info_.handle, std::move(handler)));
  });
}

void Object::removeAsync(Callback<Done> done, Timeout timeout) const {
  session_->request(selectors::kRequestDelete, info_.handle, {}, timeout,
                    forgetting(session_, info_.handle, session_->onEventQueue(std::move(done))));
}

}  // namespace orvid
