// SPDX-License-Identifier: MIT
#include "orvidcore/device_browser.h"

#include <chrono>
#include <condition_variable>
#include <map>
#include <set>

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
    setEvents({});
    for (const auto& [uuid, session] : sessions) {
      session->close();
      session->ended();
    }
    // Who made the browser may take down what its events refer to.
    for (const auto& [uuid, session] : sessions) session->waitForEvents();
    if (!events_->runsHere()) events_->runAndWait([] {});
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

  /// Blocking. A process may connect to a device once: who asks while another thread opens it waits for that.
  Result<std::shared_ptr<Device>> open(const DeviceInfo& device, Timeout timeout) {
    const auto deadline = std::chrono::steady_clock::now() + timeout;
    {
      const brivo::MutexLock lock(mutex_);
      while (opening_.contains(device.uuid)) {
        if (opened_.wait_until(mutex_, deadline) == std::cv_status::timeout)
          return Error{ErrorKind::timedOut, 0, "no answer in time"};
      }
      const auto known = sessions_.find(device.uuid);
      if (known != sessions_.end()) return std::make_shared<Device>(known->second);
      opening_.insert(device.uuid);
    }
    auto session = connect(device, timeout);
    const brivo::MutexLock lock(mutex_);
    opening_.erase(device.uuid);
    opened_.notify_all();
    if (!session.ok()) return session.error();
    sessions_.insert_or_assign(device.uuid, *session);
    return std::make_shared<Device>(*std::move(session));
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
  Result<std::shared_ptr<Session>> connect(const DeviceInfo& device, Timeout timeout) {
    const auto reply = blocking<Dictionary>(
        [&](auto handler) { call(selectors::kOpenDevice, {device.uuid}, timeout, std::move(handler)); });
    if (!reply.ok()) return reply.error();
    const auto* address = reply->string(keys::kDeviceEndpoint);
    if (!address) return Error{ErrorKind::disconnected, 0, "there is no such device"};
    return Session::open(runtime_, device, {*address}, timeout);
  }

  void call(std::string_view selector, brivo::zeph::Arguments arguments, Timeout timeout,
            Callback<Dictionary> handler) {
    connection_->remoteObjectProxyWithErrorHandler(nullptr).call(
        selector, std::move(arguments), timeout,
        [handler = std::move(handler)](const brivo::zeph::Answer& answer) {
          handler(answer.ok() ? dictionaryOf(*answer) : errorOf(answer.error()));
        });
  }

  void forget(const std::string& uuid) {
    std::shared_ptr<Session> session;
    {
      const brivo::MutexLock lock(mutex_);
      const auto found = sessions_.find(uuid);
      if (found == sessions_.end()) return;
      session = std::move(found->second);
      sessions_.erase(found);
    }
    session->ended();
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
  std::set<std::string> opening_ BRIVO_GUARDED_BY(mutex_);
  std::condition_variable_any opened_;
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
