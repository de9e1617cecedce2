// SPDX-License-Identifier: MIT
#include "orvidcore/object.h"

#include <algorithm>

#include "orvidcore/local_file.h"
#include "orvidcore/session.h"
#include "protocol/keys.h"
#include "protocol/selectors.h"

namespace orvid {

namespace keys = brivo::keys;
namespace selectors = brivo::selectors;

namespace {

/// How much one piece of a whole file asks for.
constexpr std::uint64_t kPieceSize = 2'097'152;
constexpr const char* kThumbnailSizeOption = "OVThumbnailMaxPixelSize";

void requestData(Session& session, std::uint32_t handle, std::uint64_t offset, std::uint64_t length,
                 Timeout timeout, Callback<Data> handler) {
  Dictionary options;
  options.set(keys::kReadOffset, offset);
  options.set(keys::kReadLength, length);
  session.request(selectors::kRequestReadData, handle, std::move(options), timeout,
                  [handler = std::move(handler)](const Result<Dictionary>& result) {
                    if (!result.ok()) return handler(result.error());
                    const Data* data = result->data(keys::kReadData);
                    handler(data ? *data : Data());
                  });
}

Dictionary thumbnailOptions(std::uint32_t maximumPixelSize) {
  Dictionary options;
  options.set(kThumbnailSizeOption, maximumPixelSize);
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
    requestData(*session_, info_.handle, offset, length, timeout, std::move(handler));
  });
}

void Object::readAsync(std::uint64_t offset, std::uint64_t length, Callback<Data> done,
                       Timeout timeout) const {
  requestData(*session_, info_.handle, offset, length, timeout, session_->onEventQueue(std::move(done)));
}

Result<Done> Object::save(const std::string& path, const Progress& progress, Timeout timeout) const {
  auto file = LocalFile::create(path);
  if (!file.ok()) return file.error();
  for (std::uint64_t saved = 0; saved < info_.size;) {
    const auto piece = read(saved, std::min(kPieceSize, info_.size - saved), timeout);
    if (!piece.ok()) return piece.error();
    if (piece->empty())
      return Error{ErrorKind::disconnected, 0, "the medium gave no more bytes of " + info_.path};
    if (const auto written = (*file)->append(piece->bytes()); !written.ok()) return written.error();
    saved += piece->size();
    if (progress && !progress(saved, info_.size)) return Error{ErrorKind::file, 0, "saving was stopped"};
  }
  return (*file)->commit();
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
