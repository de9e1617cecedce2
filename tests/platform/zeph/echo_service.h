// SPDX-License-Identifier: MIT
// A small service and its client over real sockets, for the tests of this folder.
#pragma once

#include <gtest/gtest.h>

#include <atomic>
#include <future>
#include <memory>
#include <mutex>
#include <semaphore>
#include <string>
#include <vector>

#include "platform/work/pool.h"
#include "platform/zeph/connection_service.h"
#include "support/temporary_folder.h"

namespace brivo::zeph {

inline constexpr const char* kEchoInterface = "org.example.Echo";

inline constexpr Member kEchoMembers[] = {
    {"echo:withReply:", Member::Kind::method, "a{sv}", "a{sv}", "value,answer,"},
    {"typed:names:withReply:", Member::Kind::method, "sas", "t", "text,names,count,"},
    {"hold", Member::Kind::method, "", "a{sv}", "answer,"},
    {"fetch", Member::Kind::method, "", "a{sv}", "answer,"},
    {"drop", Member::Kind::method, "", "a{sv}", "answer,"},
    {"only:declared:withReply:", Member::Kind::method, "", "", "", Member::Serving::declaredOnly},
    {"event:", Member::Kind::signal, "a{sv}", "", "note,"},
    {"number:", Member::Kind::signal, "u", "", "value,"},
};
inline constexpr Protocol kEchoProtocol{kEchoInterface, kEchoMembers};

inline const ClassSet kAllClasses{Value::Class::number, Value::Class::string, Value::Class::data,
                                  Value::Class::array, Value::Class::dictionary};

/// Answers "echo" with what it got, keeps the replies of "hold", drops those of "drop".
class EchoService : public ListenerDelegate, public ExportedObject {
 public:
  bool shouldAcceptNewConnection(Listener&, const std::shared_ptr<Connection>& connection) override {
    ++asked;
    if (refuse) return false;
    Interface exported(kEchoProtocol);
    exported.setClasses(kAllClasses, "typed:names:withReply:", Interface::Origin::argument);
    connection->setExportedInterface(exported);
    connection->setRemoteObjectInterface(Interface(kEchoProtocol));
    connection->setExportedObject(self);
    connection->setInterruptionHandler([this] { ++interrupted; });
    connection->setInvalidationHandler([this] { ++invalidated; });
    {
      const std::lock_guard lock(mutex);
      connections.push_back(connection);
    }
    connection->resume();
    return true;
  }

  void handle(Invocation invocation) override {
    ++handled;
    if (invocation.selector == "echo:withReply:") return invocation.reply(invocation.arguments);
    if (invocation.selector == "typed:names:withReply:") {
      return invocation.reply({std::uint64_t{invocation.arguments[1].get<Array>()->size()}});
    }
    if (invocation.selector == "fetch") return invocation.reply({Dictionary{{"data", data}}});
    if (invocation.selector == "hold") {
      const std::lock_guard lock(mutex);
      held.push_back(std::move(invocation.reply));
    }
  }

  std::shared_ptr<Connection> connection(std::size_t index = 0) {
    const std::lock_guard lock(mutex);
    return index < connections.size() ? connections[index].lock() : nullptr;
  }

  Data data;  ///< what "fetch" answers
  std::weak_ptr<EchoService> self;
  std::atomic<bool> refuse = false;
  std::atomic<int> asked = 0;
  std::atomic<int> handled = 0;
  std::atomic<int> interrupted = 0;
  std::atomic<int> invalidated = 0;
  std::mutex mutex;
  std::vector<std::weak_ptr<Connection>> connections;
  std::vector<Reply> held;
};

/// Collects the signals of a client's connection.
class SignalCollector : public ExportedObject {
 public:
  void handle(Invocation invocation) override {
    const std::lock_guard lock(mutex);
    received.emplace_back(invocation.selector, invocation.arguments.front());
  }
  std::size_t count() {
    const std::lock_guard lock(mutex);
    return received.size();
  }

  std::mutex mutex;
  std::vector<std::pair<std::string, Value>> received;
};

class EchoTest : public testing::Test {
 protected:
  EchoTest() {
    service->self = service;
    folder = std::move(RuntimeFolder::claim(temporary.path())).value();
    listener = std::move(connections->namedListener(*folder, "echo")).value();
    listener->setDelegate(service);
    listener->resume();
  }
  ~EchoTest() override { listener->invalidate(); }

  /// A connected client; its signals go to `collector`.
  std::shared_ptr<Connection> connectClient(const std::shared_ptr<ExportedObject>& collector = nullptr) {
    auto client = std::move(connections->connect(listener->endpoint(), std::chrono::seconds(10))).value();
    client->setExportedInterface(Interface(kEchoProtocol));
    client->setRemoteObjectInterface(Interface(kEchoProtocol));
    client->setExportedObject(collector);
    client->resume();
    return client;
  }

  static Answer call(const std::shared_ptr<Connection>& client, std::string_view selector,
                     Arguments arguments, std::chrono::milliseconds timeout = std::chrono::seconds(20)) {
    auto promise = std::make_shared<std::promise<Answer>>();
    auto answer = promise->get_future();
    client->remoteObjectProxyWithErrorHandler(nullptr).call(
        selector, std::move(arguments), timeout,
        [promise](Answer given) { promise->set_value(std::move(given)); });
    return answer.get();
  }
  static Answer echo(const std::shared_ptr<Connection>& client, Dictionary dictionary) {
    return call(client, "echo:withReply:", {std::move(dictionary)});
  }

  std::string socketPath() const { return temporary / "echo"; }

  test::TemporaryFolder temporary;
  std::mutex faultsMutex;
  std::vector<std::string> faults;
  std::shared_ptr<EchoService> service = std::make_shared<EchoService>();
  Pool pool{2};
  std::unique_ptr<ConnectionService> connections =
      std::make_unique<ConnectionService>(pool, [this](const std::string& line) {
        const std::lock_guard lock(faultsMutex);
        faults.push_back(line);
      });
  std::unique_ptr<RuntimeFolder> folder;
  std::shared_ptr<Listener> listener;
};

}  // namespace brivo::zeph
