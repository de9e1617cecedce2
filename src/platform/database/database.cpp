// SPDX-License-Identifier: MIT
#include "platform/database/database.h"

#include <sqlite3.h>

namespace brivo {

namespace {

constexpr int kTimeBetweenLooks = 5;  // milliseconds

using Statement = std::unique_ptr<sqlite3_stmt, decltype(&sqlite3_finalize)>;

int bind(sqlite3_stmt* statement, int index, const Database::Binding& binding) {
  if (const auto* number = std::get_if<std::int64_t>(&binding))
    return sqlite3_bind_int64(statement, index, *number);
  const auto& text = std::get<std::string>(binding);
  return sqlite3_bind_text(statement, index, text.data(), static_cast<int>(text.size()), SQLITE_TRANSIENT);
}

/// As many bytes as were stored: a text may have zeros in it.
std::optional<std::string> valueOf(sqlite3_stmt* statement, int column) {
  const auto* text = reinterpret_cast<const char*>(sqlite3_column_text(statement, column));
  if (!text) return std::nullopt;
  return std::string(text, static_cast<std::size_t>(sqlite3_column_bytes(statement, column)));
}

Database::Row rowOf(sqlite3_stmt* statement) {
  Database::Row row;
  for (int i = 0; i < sqlite3_column_count(statement); ++i) {
    row.emplace_back(sqlite3_column_name(statement, i), valueOf(statement, i));
  }
  return row;
}

/// What is in the file was perhaps not written by us: its views and triggers are not run, and no statement
/// may write what only the engine does.
void distrust(sqlite3* handle) {
  sqlite3_db_config(handle, SQLITE_DBCONFIG_ENABLE_VIEW, 0, nullptr);
  sqlite3_db_config(handle, SQLITE_DBCONFIG_ENABLE_TRIGGER, 0, nullptr);
  sqlite3_db_config(handle, SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr);
  sqlite3_db_config(handle, SQLITE_DBCONFIG_DEFENSIVE, 1, nullptr);
}

/// Looks often for as long as another process holds the file: the engine's own waiting looks ever more
/// seldom, and a process that writes one thing after the other then comes first each time.
int waitForOthers(void*, int looks) {
  if (looks >= Database::kBusyTime / kTimeBetweenLooks) return 0;
  sqlite3_sleep(kTimeBetweenLooks);
  return 1;
}

}  // namespace

Result<std::unique_ptr<Database>> Database::open(const std::string& path) {
  sqlite3* handle = nullptr;
  const int result = sqlite3_open_v2(
      path.c_str(), &handle, SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE | SQLITE_OPEN_NOMUTEX, nullptr);
  if (result != SQLITE_OK) {
    SystemError error{"open " + path + ": " + sqlite3_errstr(result)};
    sqlite3_close(handle);
    return error;
  }
  distrust(handle);
  sqlite3_busy_handler(handle, waitForOthers, nullptr);
  return std::unique_ptr<Database>(new Database(handle));
}

Database::~Database() { sqlite3_close_v2(handle_); }

std::optional<std::string> Database::execute(const std::string& statement,
                                             std::initializer_list<Binding> bindings,
                                             const RowHandler& onRow) {
  if (!durable_) makeDurable();
  return run(statement, bindings, onRow);
}

void Database::makeDurable() {
  // Reads the file, and may have to be tried again: who waits for a lock waits once, for the statement
  // itself.
  sqlite3_busy_handler(handle_, nullptr, nullptr);
  durable_ = !run("PRAGMA synchronous = EXTRA", {}, nullptr);
  sqlite3_busy_handler(handle_, waitForOthers, nullptr);
}

std::optional<std::string> Database::run(const std::string& statement,
                                         std::initializer_list<Binding> bindings, const RowHandler& onRow) {
  sqlite3_stmt* raw = nullptr;
  if (sqlite3_prepare_v2(handle_, statement.c_str(), -1, &raw, nullptr) != SQLITE_OK)
    return sqlite3_errmsg(handle_);
  const Statement prepared(raw, &sqlite3_finalize);
  int index = 0;
  for (const Binding& binding : bindings) {
    if (bind(raw, ++index, binding) != SQLITE_OK) return sqlite3_errmsg(handle_);
  }
  int result = SQLITE_ROW;
  while ((result = sqlite3_step(raw)) == SQLITE_ROW) {
    if (onRow) onRow(rowOf(raw));
  }
  if (result != SQLITE_DONE) return sqlite3_errmsg(handle_);
  return std::nullopt;
}

std::optional<bool> Database::hasColumn(const std::string& table, const std::string& column) {
  const int result = sqlite3_table_column_metadata(handle_, nullptr, table.c_str(), column.c_str(), nullptr,
                                                   nullptr, nullptr, nullptr, nullptr);
  if (result == SQLITE_OK) return true;
  return result == SQLITE_ERROR ? std::optional(false) : std::nullopt;
}

bool Database::hasLostItsFile() const {
  int moved = 0;
  return sqlite3_file_control(handle_, nullptr, SQLITE_FCNTL_HAS_MOVED, &moved) == SQLITE_OK && moved != 0;
}

std::optional<std::string> Database::close() {
  if (sqlite3_close(handle_) != SQLITE_OK) return sqlite3_errmsg(handle_);
  handle_ = nullptr;
  return std::nullopt;
}

}  // namespace brivo
