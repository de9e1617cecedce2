// SPDX-License-Identifier: MIT
// A connection without a socket: it keeps what is sent, and its process may be any.
#pragma once

#include <mutex>
#include <string>
#include <utility>
#include <vector>

#include "platform/zeph/connection.h"

namespace brivo {

class FakeConnection : public zeph::Connection {
 public:
  explicit FakeConnection(std::int32_t pid) : FakeConnection(AuditToken::ofCredentials({pid, 0})) {}
  explicit FakeConnection(AuditToken token) : token_(std::move(token)) {}

  const AuditToken& auditToken() const override { return token_; }
  void setExportedInterface(zeph::Interface) override {}
  void setRemoteObjectInterface(zeph::Interface) override {}
  void setExportedObject(std::weak_ptr<zeph::ExportedObject>) override {}
  void setInterruptionHandler(Task handler) override { interruptionHandler = std::move(handler); }
  void setInvalidationHandler(Task handler) override { invalidationHandler = std::move(handler); }
  void acceptBuffers() override { takesBuffers = true; }
  void resume() override { resumed = true; }
  void invalidate() override { ++invalidated; }
  bool isBacklogged() const override { return backlogged; }
  void whenNotBacklogged(Task task) override { waiting.push_back(std::move(task)); }

  std::size_t sentCount() {
    const std::lock_guard lock(mutex);
    return sent.size();
  }
  /// The dictionary of the message with this number.
  const Dictionary& note(std::size_t index) { return *sent.at(index).second->front().get<Dictionary>(); }

  Task interruptionHandler;
  Task invalidationHandler;
  bool takesBuffers = false;
  bool resumed = false;
  bool backlogged = false;
  int invalidated = 0;
  std::vector<Task> waiting;
  std::mutex mutex;
  std::vector<std::pair<std::string, std::shared_ptr<const zeph::Arguments>>> sent;

 private:
  void send(std::string_view selector, std::shared_ptr<const zeph::Arguments> arguments,
            const zeph::ErrorHandler&) override {
    const std::lock_guard lock(mutex);
    sent.emplace_back(selector, std::move(arguments));
  }
  void call(std::string_view, zeph::Arguments, std::chrono::milliseconds, zeph::AnswerHandler) override {}

  AuditToken token_;
};

}  // namespace brivo
