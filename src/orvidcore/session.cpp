// SPDX-License-Identifier: MIT
#include "orvidcore/session.h"

#include "protocol/keys.h"
#include "protocol/protocols.h"
#include "protocol/result_codes.h"
#include "protocol/selectors.h"

namespace orvid {

namespace keys = brivo::keys;
namespace selectors = brivo::selectors;

namespace {

brivo::zeph::Interface exportedInterface() {
  return brivo::restrictedInterface(brivo::korvelProtocol(), {{selectors::kPostNotification, 0},
                                                              {selectors::kNotifyAddedItems, 0},
                                                              {selectors::kNotifyPercentCompleted, 0}});
}

brivo::zeph::Interface remoteInterface() {
  return brivo::restrictedInterface(brivo::korvelProtocol(), {{selectors::kRequestThumbnail, 1},
                                                              {selectors::kRequestMetadata, 1},
                                                              {selectors::kRequestDownload, 1},
                                                              {selectors::kRequestDelete, 1},
                                                              {selectors::kRequestReadData, 1}});
}

Error requestError(std::int64_t code) {
  const auto text = [&] {
    switch (code) {
      case brivo::kResultNoSuchObject:
        return "no such object";
      case brivo::kResultBadRange:
        return "the range is outside the object";
      case brivo::kResultReadTooLong:
        return "the range is too long";
      case brivo::kResultDeleteFailed:
        return "the file could not be deleted";
      case brivo::kResultDownloadNotOffered:
        return "whole objects are not sent";
      default:
        return "the request failed";
    }
  };
  return {ErrorKind::request, static_cast<std::int32_t>(code), text()};
}

}  // namespace

Result<std::shared_ptr<Session>> Session::open(std::shared_ptr<Runtime> runtime, const DeviceInfo& info,
                                               const brivo::Endpoint& endpoint, Timeout timeout) {
  auto connected = runtime->connections().connect(endpoint, timeout);
  if (!connected.ok()) return Error{ErrorKind::disconnected, 0, connected.error().text()};
  auto connection = *std::move(connected);
  std::shared_ptr<Session> session(new Session(std::move(runtime), info, connection));
  connection->setExportedInterface(exportedInterface());
  connection->setRemoteObjectInterface(remoteInterface());
  connection->setExportedObject(session);
  const brivo::Task onEnd = [weak = std::weak_ptr(session)] {
    if (const auto self = weak.lock()) self->ended();
  };
  connection->setInterruptionHandler(onEnd);
  connection->setInvalidationHandler(onEnd);
  connection->resume();
  return session;
}

Session::Session(std::shared_ptr<Runtime> runtime, DeviceInfo info,
                 std::shared_ptr<brivo::zeph::Connection> connection)
    : runtime_(std::move(runtime)),
      info_(std::move(info)),
      connection_(std::move(connection)),
      events_(runtime_->makeQueue()) {}

Session::~Session() { connection_->invalidate(); }

void Session::setEvents(DeviceEvents events) {
  const brivo::MutexLock lock(mutex_);
  told_ = std::make_shared<const DeviceEvents>(std::move(events));
}

// -------------------------------------------------------------------------------------------------- calling

void Session::call(std::string_view selector, brivo::zeph::Arguments arguments, Timeout timeout,
                   Handler handler) {
  connection_->remoteObjectProxyWithErrorHandler(nullptr).call(
      selector, std::move(arguments), timeout,
      [self = shared_from_this(), handler = std::move(handler)](const brivo::zeph::Answer& answer) {
        if (answer.ok()) {
          self->answered_ = true;
          return handler(*answer);
        }
        Error error = errorOf(answer.error());
        handler(error.kind == ErrorKind::disconnected ? self->ending() : std::move(error));
      });
}

Error Session::ending() const {
  if (answered_) return {ErrorKind::disconnected, 0, "the connection ended"};
  return {ErrorKind::refused, 0, "this application may not use the device"};
}

void Session::request(std::string_view selector, std::uint32_t handle, Dictionary options, Timeout timeout,
                      Callback<Dictionary> handler) {
  call(selector, {std::uint64_t{handle}, std::move(options)}, timeout,
       [handler = std::move(handler)](const Result<brivo::zeph::Arguments>& answer) {
         auto result = answer.ok() ? dictionaryOf(*answer) : answer.error();
         if (!result.ok()) return handler(std::move(result));
         const auto code = result->signedInteger(keys::kErrorCode).value_or(brivo::kResultSuccess);
         if (code != brivo::kResultSuccess) return handler(requestError(code));
         handler(std::move(result));
       });
}

void Session::start(Timeout timeout, Callback<Dictionary> handler) {
  call(selectors::kRequestStartUsing, {}, timeout,
       [handler = std::move(handler)](const Result<brivo::zeph::Arguments>& answer) {
         handler(answer.ok() ? dictionaryOf(*answer) : answer.error());
       });
}

void Session::enumerate(const Dictionary& options, Timeout timeout, Callback<Done> handler) {
  call(selectors::kEnumerateContent, {options}, timeout,
       [self = shared_from_this(),
        handler = std::move(handler)](const Result<brivo::zeph::Arguments>& answer) {
         if (answer.ok()) self->enumerated_ = true;
         handler(answer.ok() ? Result<Done>(Done()) : Result<Done>(answer.error()));
       });
}

Result<Done> Session::settle(Timeout timeout) {
  const auto deadline = std::chrono::steady_clock::now() + timeout;
  if (!enumerated_) {
    const auto started = blocking<Dictionary>([&](auto handler) { start(timeout, std::move(handler)); });
    if (!started.ok()) return started.error();
    const auto begun = blocking<Done>([&](auto handler) { enumerate({}, timeout, std::move(handler)); });
    if (!begun.ok()) return begun.error();
  }
  const auto left = std::chrono::duration_cast<Timeout>(deadline - std::chrono::steady_clock::now());
  switch (catalogue_.waitUntilSettled(left)) {
    case Catalogue::Wait::closed:
      return ending();
    case Catalogue::Wait::tooLong:
      return Error{ErrorKind::timedOut, 0, "the catalogue did not arrive in time"};
    default:
      return Done();
  }
}

// ------------------------------------------------------------------------------------------------ receiving

void Session::handle(brivo::zeph::Invocation invocation) {
  if (invocation.arguments.empty()) return;
  const Value& argument = invocation.arguments.front();
  const auto* dictionary = argument.get<Dictionary>();
  if (invocation.selector == selectors::kNotifyAddedItems && dictionary) {
    receivedItems(*dictionary);
  } else if (invocation.selector == selectors::kPostNotification && dictionary) {
    receivedNote(*dictionary);
  } else if (invocation.selector == selectors::kNotifyPercentCompleted) {
    post([percent =
              static_cast<std::uint32_t>(argument.asUnsigned().value_or(0))](const DeviceEvents& events) {
      if (events.onPercent) events.onPercent(percent);
    });
  }
}

void Session::receivedItems(const Dictionary& batch) {
  const auto* datasets = batch.array(keys::kObjectInfoArray);
  if (!datasets) return;
  post([items = catalogue_.add(*datasets)](const DeviceEvents& events) {
    if (events.onItems) events.onItems(items);
  });
}

void Session::receivedNote(const Dictionary& note) {
  const std::string* type = note.string(keys::kType);
  if (!type) return;
  if (*type == keys::kDeviceIsReady) {
    const auto count =
        static_cast<std::int32_t>(note.signedInteger(keys::kNumberOfPreflightObjects).value_or(0));
    catalogue_.ready(count);
    post([count](const DeviceEvents& events) {
      if (events.onReady) events.onReady(count);
    });
  } else if (*type == keys::kDownloadProgress) {
    post([handle = static_cast<std::uint32_t>(note.unsignedInteger(keys::kObjectID).value_or(0)),
          bytes = note.unsignedInteger(keys::kDownloadedBytes).value_or(0),
          percent = note.real(keys::kDownloadedPercent).value_or(0)](const DeviceEvents& events) {
      if (events.onProgress) events.onProgress(handle, bytes, percent);
    });
  }
}

void Session::ended() {
  if (ended_.exchange(true)) return;
  catalogue_.close();
  // The last event finds the session alive, whoever has let go of it meanwhile.
  events_->post([self = shared_from_this()] {
    self->lastEventTold_ = true;
    const auto events = self->told();
    if (events->onClosed) events->onClosed();
  });
}

void Session::waitForEvents() {
  if (!events_->runsHere()) events_->runAndWait([] {});
}

void Session::post(std::function<void(const DeviceEvents&)> tell) {
  events_->post([weak = weak_from_this(), tell = std::move(tell)] {
    const auto self = weak.lock();
    if (self && !self->lastEventTold_) tell(*self->told());
  });
}

std::shared_ptr<const DeviceEvents> Session::told() const {
  const brivo::MutexLock lock(mutex_);
  return told_;
}

}  // namespace orvid
