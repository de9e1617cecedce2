// SPDX-License-Identifier: MIT
#include "orvidcore/device_browser.h"

#include <map>

#include "orvidcore/runtime.h"
#include "orvidcore/session.h"
#include "platform/base/paths.h"
#include "platform/settings/settings.h"
#include "platform/zeph/address.h"
#include "protocol/keys.h"
#include "protocol/protocols.h"
#include "protocol/selectors.h"

namespace orvid {

namespace keys = brivo::keys;
namespace selectors = brivo::selectors;

namespace {

brivo::Endpoint serviceEndpoint(const std::string& address) {
  if (!address.empty()) return {address};
  const auto settings = brivo::Settings::fromEnvironment();
  return brivo::zeph::endpointForPath(brivo::appendingPathComponent(settings.runtimeDir, "manager"));
}

DeviceInfo infoOf(const Dictionary& context) {
  DeviceInfo info;
  if (const auto* uuid = context.string(keys::kDeviceHandle)) info.uuid = *uuid;
  if (const auto* path = context.string(keys::kDevicePrimaryIdentifier)) info.mountPath = *path;
  info.name = brivo::lastPathComponent(info.mountPath);
  return info;
}

std::vector<DeviceInfo> infosOf(const Dictionary& list) {
  std::vector<DeviceInfo> infos;
  const auto* contexts = list.array(keys::kDeviceContexts);
  for (const Value& context : contexts ? *contexts : brivo::Array()) {
    if (const auto* dictionary = context.get<Dictionary>()) infos.push_back(infoOf(*dictionary));
  }
  return infos;
}

}  // namespace

/// The connection to the manager. Handlers run on its queue.
class DeviceBrowser::Implementation final : public brivo::zeph::ExportedObject,
                                            public std::enable_shared_from_this<Implementation> {
 public:
  Implementation(std::shared_ptr<Runtime> runtime, std::shared_ptr<brivo::zeph::Connection> connection)
      : runtime_(std::move(runtime)), connection_(std::move(connection)), events_(runtime_->makeQueue()) {}

  void start() {
    using brivo::restrictedInterface;
    connection_->setExportedInterface(
        restrictedInterface(brivo::deviceManagerProtocol(),
                            {{selectors::kNotifyAddedDevice, 0}, {selectors::kNotifyRemovedDevice, 0}}));
    connection_->setRemoteObjectInterface(restrictedInterface(
        brivo::deviceManagerProtocol(), {{selectors::kRequestDeviceList, 1}, {selectors::kOpenDevice, 1}}));
    connection_->setExportedObject(weak_from_this());
    const brivo::Task onEnd = [weak = weak_from_this()] {
      const auto self = weak.lock();
      if (self)
        self->post([](const BrowserEvents& events) {
          if (events.onClosed) events.onClosed();
        });
    };
    connection_->setInterruptionHandler(onEnd);
    connection_->setInvalidationHandler(onEnd);
    connection_->resume();
  }

  void stop() {
    connection_->invalidate();
    std::map<std::string, std::shared_ptr<Session>> sessions;
    {
      const brivo::MutexLock lock(mutex_);
      sessions.swap(sessions_);
    }
    for (const auto& [uuid, session] : sessions) session->close();
  }

  void setEvents(BrowserEvents events) {
    const brivo::MutexLock lock(mutex_);
    told_ = std::make_shared<const BrowserEvents>(std::move(events));
  }

  void requestDevices(Timeout timeout, Callback<std::vector<DeviceInfo>> handler) {
    call(selectors::kRequestDeviceList, {}, timeout,
         [handler = std::move(handler)](const Result<Dictionary>& list) {
           handler(list.ok() ? Result<std::vector<DeviceInfo>>(infosOf(*list)) : list.error());
         });
  }

  /// Blocking.
  Result<std::shared_ptr<Device>> open(const DeviceInfo& device, Timeout timeout) {
    if (auto known = knownSession(device.uuid)) return std::make_shared<Device>(std::move(known));
    const auto reply = blocking<Dictionary>(
        [&](auto handler) { call(selectors::kOpenDevice, {device.uuid}, timeout, std::move(handler)); });
    if (!reply.ok()) return reply.error();
    const auto* address = reply->string(keys::kDeviceEndpoint);
    if (!address) return Error{ErrorKind::disconnected, 0, "there is no such device"};
    auto session = Session::open(runtime_, device, {*address}, timeout);
    if (!session.ok()) return session.error();
    const brivo::MutexLock lock(mutex_);
    const auto [entry, isNew] = sessions_.try_emplace(device.uuid, *session);
    return std::make_shared<Device>(entry->second);
  }

  void runInBackground(brivo::Task task) { runtime_->pool().post(std::move(task)); }
  const std::shared_ptr<brivo::SerialQueue>& events() const { return events_; }

  void handle(brivo::zeph::Invocation invocation) override {
    const auto* context =
        invocation.arguments.empty() ? nullptr : invocation.arguments.front().get<Dictionary>();
    if (!context) return;
    const DeviceInfo info = infoOf(*context);
    const bool added = invocation.selector == selectors::kNotifyAddedDevice;
    if (!added) forget(info.uuid);
    post([info, added](const BrowserEvents& events) {
      const auto& tell = added ? events.onAdded : events.onRemoved;
      if (tell) tell(info);
    });
  }

 private:
  void call(std::string_view selector, brivo::zeph::Arguments arguments, Timeout timeout,
            Callback<Dictionary> handler) {
    connection_->remoteObjectProxyWithErrorHandler(nullptr).call(
        selector, std::move(arguments), timeout,
        [handler = std::move(handler)](const brivo::zeph::Answer& answer) {
          if (!answer.ok()) return handler(errorOf(answer.error()));
          const auto* dictionary = answer->empty() ? nullptr : answer->front().get<Dictionary>();
          handler(dictionary ? Result<Dictionary>(*dictionary)
                             : Error{ErrorKind::malformed, 0, "the answer is no dictionary"});
        });
  }

  std::shared_ptr<Session> knownSession(const std::string& uuid) {
    const brivo::MutexLock lock(mutex_);
    const auto found = sessions_.find(uuid);
    return found == sessions_.end() ? nullptr : found->second;
  }

  void forget(const std::string& uuid) {
    std::shared_ptr<Session> session;  // ends after the lock
    const brivo::MutexLock lock(mutex_);
    const auto found = sessions_.find(uuid);
    if (found == sessions_.end()) return;
    session = std::move(found->second);
    sessions_.erase(found);
  }

  void post(std::function<void(const BrowserEvents&)> tell) {
    events_->post([weak = weak_from_this(), tell = std::move(tell)] {
      const auto self = weak.lock();
      if (!self) return;
      std::shared_ptr<const BrowserEvents> events;
      {
        const brivo::MutexLock lock(self->mutex_);
        events = self->told_;
      }
      tell(*events);
    });
  }

  const std::shared_ptr<Runtime> runtime_;
  const std::shared_ptr<brivo::zeph::Connection> connection_;
  const std::shared_ptr<brivo::SerialQueue> events_;

  brivo::Mutex mutex_;
  std::shared_ptr<const BrowserEvents> told_ BRIVO_GUARDED_BY(mutex_) =
      std::make_shared<const BrowserEvents>();
  std::map<std::string, std::shared_ptr<Session>> sessions_ BRIVO_GUARDED_BY(mutex_);
};

Result<std::shared_ptr<DeviceBrowser>> DeviceBrowser::connect(const std::string& address, Timeout timeout) {
  auto runtime = Runtime::create();
  auto connection = runtime->connections().connect(serviceEndpoint(address), timeout);
  if (!connection.ok()) return Error{ErrorKind::noService, 0, connection.error().text()};
  auto implementation = std::make_shared<Implementation>(std::move(runtime), *std::move(connection));
  implementation->start();
  return std::shared_ptr<DeviceBrowser>(new DeviceBrowser(std::move(implementation)));
}

DeviceBrowser::DeviceBrowser(std::shared_ptr<Implementation> implementation)
    : implementation_(std::move(implementation)) {}

DeviceBrowser::~DeviceBrowser() { implementation_->stop(); }

void DeviceBrowser::setEvents(BrowserEvents events) { implementation_->setEvents(std::move(events)); }

Result<std::vector<DeviceInfo>> DeviceBrowser::devices(Timeout timeout) const {
  return blocking<std::vector<DeviceInfo>>(
      [&](auto handler) { implementation_->requestDevices(timeout, std::move(handler)); });
}

void DeviceBrowser::devicesAsync(Callback<std::vector<DeviceInfo>> done, Timeout timeout) const {
  implementation_->requestDevices(
      timeout, [queue = implementation_->events(), done = std::move(done)](const auto& result) {
        queue->post([done, result] { done(result); });
      });
}

Result<std::shared_ptr<Device>> DeviceBrowser::open(const DeviceInfo& device, Timeout timeout) {
  return implementation_->open(device, timeout);
}

void DeviceBrowser::openAsync(const DeviceInfo& device, Callback<std::shared_ptr<Device>> done,
                              Timeout timeout) {
  implementation_->runInBackground(
      [implementation = implementation_, device, done = std::move(done), timeout] {
        auto result = implementation->open(device, timeout);
        implementation->events()->post([done, result = std::move(result)] { done(result); });
      });
}

}  // namespace orvid
