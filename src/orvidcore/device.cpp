// SPDX-License-Identifier: MIT
#include "orvidcore/device.h"

#include "orvidcore/session.h"
#include "protocol/selectors.h"

namespace orvid {

namespace {

Result<std::vector<Object>> settledObjects(const std::shared_ptr<Session>& session, Timeout timeout) {
  const auto settled = session->settle(timeout);
  if (!settled.ok()) return settled.error();
  std::vector<Object> objects;
  for (ObjectInfo& info : session->catalogue().all()) objects.emplace_back(session, std::move(info));
  return objects;
}

}  // namespace

const DeviceInfo& Device::info() const { return session_->info(); }

void Device::setEvents(DeviceEvents events) const { session_->setEvents(std::move(events)); }

Result<Dictionary> Device::start(Timeout timeout) const {
  return blocking<Dictionary>([&](auto handler) { session_->start(timeout, std::move(handler)); });
}

void Device::startAsync(Callback<Dictionary> done, Timeout timeout) const {
  session_->start(timeout, session_->onEventQueue(std::move(done)));
}

Result<Done> Device::registerInterests(const std::vector<std::string>& types, Timeout timeout) const {
  brivo::Array array(brivo::Array::Kind::strings);
  for (const std::string& type : types) array.append(type);
  return blocking<Done>([&](auto handler) {
    session_->call(brivo::selectors::kRegisterInterests, {std::move(array)}, timeout,
                   [handler = std::move(handler)](const Result<brivo::zeph::Arguments>& answer) {
                     handler(answer.ok() ? Result<Done>(Done()) : Result<Done>(answer.error()));
                   });
  });
}

Result<Done> Device::enumerate(const Dictionary& options, Timeout timeout) const {
  return blocking<Done>([&](auto handler) { session_->enumerate(options, timeout, std::move(handler)); });
}

void Device::enumerateAsync(const Dictionary& options, Callback<Done> done, Timeout timeout) const {
  session_->enumerate(options, timeout, session_->onEventQueue(std::move(done)));
}

Result<std::vector<Object>> Device::catalogue(Timeout timeout) const {
  return settledObjects(session_, timeout);
}

void Device::catalogueAsync(Callback<std::vector<Object>> done, Timeout timeout) const {
  session_->runInBackground([session = session_, done = session_->onEventQueue(std::move(done)), timeout] {
    done(settledObjects(session, timeout));
  });
}

std::optional<Object> Device::object(std::uint32_t handle) const {
  const auto info = session_->catalogue().find(handle);
  return info ? std::optional<Object>(Object(session_, *info)) : std::nullopt;
}

}  // namespace orvid
