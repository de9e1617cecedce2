// SPDX-License-Identifier: MIT
#include "in_process_catalogue.h"

#include <future>

#include "protocol/keys.h"
#include "protocol/selectors.h"
#include "support/standard_error.h"

namespace brivo::bench {

namespace {

/// A client without a socket that tells a recorder what it is sent.
class CountingClient final : public zeph::Connection {
 public:
  explicit CountingClient(std::shared_ptr<CatalogueRecorder> recorder) : recorder_(std::move(recorder)) {}

  const AuditToken& auditToken() const override { return token_; }
  void setExportedInterface(zeph::Interface) override {}
  void setRemoteObjectInterface(zeph::Interface) override {}
  void setExportedObject(std::weak_ptr<zeph::ExportedObject>) override {}
  void setInterruptionHandler(Task) override {}
  void setInvalidationHandler(Task) override {}
  void acceptBuffers() override {}
  void resume() override {}
  void invalidate() override {}
  bool isBacklogged() const override { return false; }
  void whenNotBacklogged(Task task) override { task(); }

 private:
  void send(std::string_view selector, std::shared_ptr<const zeph::Arguments> arguments,
            const zeph::ErrorHandler&) override {
    if (selector != selectors::kNotifyAddedItems) return;
    recorder_->arrived(arguments->front().get<Dictionary>()->array(keys::kObjectInfoArray)->size());
  }
  void call(std::string_view, zeph::Arguments, std::chrono::milliseconds, zeph::AnswerHandler) override {}

  const std::shared_ptr<CatalogueRecorder> recorder_;
  const AuditToken token_ = AuditToken::ofThisProcess();
};

void startUsing(BrivoDevice& device) {
  std::promise<void> started;
  device.requestStartUsingDeviceWithReply([&](const Dictionary&) { started.set_value(); });
  started.get_future().wait();
}

}  // namespace

InProcessCatalogue::InProcessCatalogue()
    : folder_(std::move(zeph::RuntimeFolder::claim(runtime_.path())).value()) {}

InProcessCatalogue::~InProcessCatalogue() { pool_.waitUntilIdle(); }

DeviceServices InProcessCatalogue::services() {
  return {pool_,
          systemFiles(),
          images_,
          movies_,
          power_,
          nullptr,
          [this] { return std::move(connections_.anonymousListener(*folder_)).value(); },
          [](const AuditToken&) { return std::nullopt; },
          [] { return Dictionary{}; },
          volumeStatistics};
}

double InProcessCatalogue::enumerate(const Card& card) {
  const test::StandardErrorCapture log;
  auto device = BrivoDevice::initWithURL(Url::file(card.path()), services());
  const auto recorder = std::make_shared<CatalogueRecorder>(card.objects());
  const auto client = std::make_shared<CountingClient>(recorder);
  device->clientManager().addClientWithConnection(client);
  startUsing(*device);
  std::promise<void> begun;
  recorder->begin();
  device->enumerateContentWithOptions({}, client, [&] { begun.set_value(); });
  const double last = recorder->wait().last;
  begun.get_future().wait();
  device.reset();
  pool_.waitUntilIdle();  // the last step of a walk may still hold the device and log
  return last;
}

}  // namespace brivo::bench
