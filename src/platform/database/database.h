// SPDX-License-Identifier: MIT
#pragma once

#include <functional>
#include <initializer_list>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "platform/base/result.h"

struct sqlite3;

namespace brivo {

/// One SQLite database file. Another process that writes it is waited for, up to kBusyTime. What a statement
/// has changed is on the medium when it returns, and stays whatever becomes of the process or the power.
/// Views and triggers in the file are not run. *Thread-bound*: one thread at a time.
class Database {
 public:
  static constexpr int kBusyTime = 5000;  ///< milliseconds

  /// Column name and value as text; no value for NULL.
  using Row = std::vector<std::pair<std::string, std::optional<std::string>>>;
  using RowHandler = std::function<void(const Row&)>;
  using Binding = std::variant<std::int64_t, std::string>;

  /// Opens or makes the file (its folder must be there). What is in it is first looked at by a statement.
  static Result<std::unique_ptr<Database>> open(const std::string& path);
  ~Database();
  Database(const Database&) = delete;
  Database& operator=(const Database&) = delete;

  /// Runs one statement with its parameters ("?") bound in order, calling `onRow` for every row. The engine's
  /// message on failure; rows before it have been handed over.
  [[nodiscard]] std::optional<std::string> execute(const std::string& statement,
                                                   std::initializer_list<Binding> bindings = {},
                                                   const RowHandler& onRow = nullptr);
  /// None when the file does not tell.
  std::optional<bool> hasColumn(const std::string& table, const std::string& column);
  /// True when the file was removed, or another was put in its place, since it was opened: statements still
  /// go to the one that nobody else sees any more.
  bool hasLostItsFile() const;
  /// The engine's message when the file cannot be closed; it is closed when this goes at the latest.
  [[nodiscard]] std::optional<std::string> close();

 private:
  explicit Database(sqlite3* handle) : handle_(handle) {}

  /// Has the engine wait until the folder knows, too, that a change is complete.
  void makeDurable();
  std::optional<std::string> run(const std::string& statement, std::initializer_list<Binding> bindings,
                                 const RowHandler& onRow);

  sqlite3* handle_;
  bool durable_ = false;
};

}  // namespace brivo
