// SPDX-License-Identifier: MIT
#include "platform/database/database.h"

#include <sqlite3.h>

namespace brivo {

namespace {

using Statement = std::unique_ptr<sqlite3_stmt, decltype(&sqlite3_finalize)>;

int bind(sqlite3_stmt* statement, int index, const Database::Binding& binding) {
  if (const auto* number = std::get_if<std::int64_t>(&binding))
    return sqlite3_bind_int64(statement, index, *number);
  const auto& text = std::get<std::string>(binding);
  return sqlite3_bind_text(statement, index, text.data(), static_cast<int>(text.size()), SQLITE_TRANSIENT);
}

Database::Row rowOf(sqlite3_stmt* statement) {
  Database::Row row;
  for (int i = 0; i < sqlite3_column_count(statement); ++i) {
    const auto* text = reinterpret_cast<const char*>(sqlite3_column_text(statement, i));
    row.emplace_back(sqlite3_column_name(statement, i),
                     text ? std::optional<std::string>(text) : std::nullopt);
  }
  return row;
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
  sqlite3_busy_timeout(handle, kBusyTime);
  return std::unique_ptr<Database>(new Database(handle));
}

Database::~Database() { sqlite3_close_v2(handle_); }

std::optional<std::string> Database::execute(const std::string& statement,
                                             std::initializer_list<Binding> bindings,
                                             const RowHandler& onRow) {
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

bool Database::hasColumn(const std::string& table, const std::string& column) {
  return sqlite3_table_column_metadata(handle_, nullptr, table.c_str(), column.c_str(), nullptr, nullptr,
                                       nullptr, nullptr, nullptr) == SQLITE_OK;
}

std::optional<std::string> Database::close() {
  if (sqlite3_close(handle_) != SQLITE_OK) return sqlite3_errmsg(handle_);
  handle_ = nullptr;
  return std::nullopt;
}

}  // namespace brivo
