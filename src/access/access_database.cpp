// SPDX-License-Identifier: MIT
#include "access/access_database.h"

#include <charconv>
#include <ctime>

#include "platform/base/paths.h"
#include "platform/settings/folders.h"
#include "util/log.h"

namespace brivo {

namespace {

constexpr const char* kTag = "ovaccess";
constexpr const char* kControlListTag = "ovcontrol";

const char* nameOf(AccessDatabase::Table table) {
  return table == AccessDatabase::Table::control ? "camera_control" : "orvid_apps";
}

std::int64_t now() { return static_cast<std::int64_t>(std::time(nullptr)); }

std::int64_t flag(bool value) { return value ? 1 : 0; }

}  // namespace

AccessDatabase::AccessDatabase(Pool& pool, std::string folder)
    : folder_(std::move(folder)), deviceAccessQueue_(SerialQueue::create(pool)) {
  deviceAccessQueue_->runAndWait([this] { open(); });
}

AccessDatabase::~AccessDatabase() {
  deviceAccessQueue_->runAndWait([&] {
    if (database_ && database_->close()) OVLogError(kTag, "Failed to close database");
  });
}

void AccessDatabase::open() {
  const auto folderFailure = makePrivateFolder(folder_);
  auto opened = Database::open(appendingPathComponent(folder_, "externalMediaAccess.db"));
  const std::string failure = folderFailure ? folderFailure->text()
                              : opened.ok() ? std::string()
                                            : opened.error().text();
  if (!opened.ok() && failure != openFailure_) OVLogError(kTag, "Failed to open/create database");
  if (!failure.empty() && failure != openFailure_) OVLogError(kTag, "{}", failure);
  openFailure_ = failure;
  if (!opened.ok()) return;
  database_ = *std::move(opened);
  createTables();
}

void AccessDatabase::createTables() {
  for (const char* table : {"orvid_apps", "camera_control"}) {
    const auto failure = database_->execute(std::string("CREATE TABLE IF NOT EXISTS ") + table +
                                            " (ID INTEGER PRIMARY KEY AUTOINCREMENT, bundle_id TEXT,"
                                            " date_added INTEGER, whitelisted INTEGER)");
    if (failure) OVLogError(kTag, "Failed to create table: {} - {}", table, *failure);
  }
  if (database_->hasColumn("camera_control", "whitelisted").value_or(true)) return;
  OVLogError(kTag, "'whitelisted' does not appear in camera_control, updating database");
  if (const auto failure = database_->execute("ALTER TABLE camera_control add whitelisted INTEGER")) {
    OVLogError(kTag, "Failed to create column: camera_control|whitelisted - {}", *failure);
  }
}

void AccessDatabase::reopenIfLost() {
  if (database_ && !database_->hasLostItsFile()) return;
  if (database_) OVLogError(kTag, "The database is not where it was, opening it anew");
  database_.reset();
  open();
}

std::optional<std::string> AccessDatabase::run(const std::string& statement,
                                               std::initializer_list<Database::Binding> bindings,
                                               const Database::RowHandler& onRow) {
  std::optional<std::string> failure;
  deviceAccessQueue_->runAndWait([&] {
    reopenIfLost();
    failure = database_ ? database_->execute(statement, bindings, onRow) : "no database";
  });
  return failure;
}

void AccessDatabase::execute(const char* tag, const std::string& statement,
                             std::initializer_list<Database::Binding> bindings,
                             const Database::RowHandler& onRow) {
  if (const auto failure = run(statement, bindings, onRow)) OVLogError(tag, "{}", *failure);
}

std::optional<std::string> AccessDatabase::whyUnreadable(Table table) {
  return run(std::string("SELECT bundle_id FROM ") + nameOf(table) + " LIMIT 1;");
}

std::vector<std::string> AccessDatabase::list(const char* tag, const std::string& statement) {
  std::vector<std::string> identifiers;
  execute(tag, statement, {}, [&](const Database::Row& row) {
    for (std::string& value : OVAcessQueryCompletion(row)) identifiers.push_back(std::move(value));
  });
  return identifiers;
}

std::vector<std::string> AccessDatabase::bundleIdentifiersAccessingExternalCameras() {
  return list(kTag, "SELECT bundle_id FROM orvid_apps;");
}

std::vector<Dictionary> AccessDatabase::bundleIdentifiersAccessingExternalCamerasWithStatus() {
  std::vector<Dictionary> rows;
  execute(kTag, "SELECT bundle_id, whitelisted FROM orvid_apps;", {},
          [&](const Database::Row& row) { rows.push_back(OVAcessStatusQueryCompletion(row)); });
  return rows;
}

void AccessDatabase::addApplicationWithBundleIdentifier(const std::string& bundleIdentifier, bool whitelist) {
  execute(kTag, "INSERT INTO orvid_apps(bundle_id,date_added,whitelisted) VALUES (?,?,?);",
          {bundleIdentifier, now(), flag(whitelist)});
}

void AccessDatabase::updateApplicationWithBundleIdentifier(const std::string& bundleIdentifier, bool status) {
  execute(kTag, "UPDATE orvid_apps SET whitelisted = ? WHERE bundle_id = ?;",
          {flag(status), bundleIdentifier});
}

void AccessDatabase::revokeApplicationWithBundleIdentifier(const std::string& bundleIdentifier) {
  OVLogError(kTag, "Revoking Application BundleID {}", bundleIdentifier);
  execute(kTag, "DELETE FROM orvid_apps WHERE bundle_id IS ?;", {bundleIdentifier});
}

std::vector<std::string> AccessDatabase::bundleIdentifiersControllingExternalCameras() {
  return list(kControlListTag, "SELECT bundle_id FROM camera_control;");
}

void AccessDatabase::addControlApplicationWithBundleIdentifier(const std::string& bundleIdentifier,
                                                               bool whitelisted) {
  execute(kTag, "INSERT INTO camera_control(bundle_id,date_added,whitelisted) VALUES (?,?,?);",
          {bundleIdentifier, now(), flag(whitelisted)});
}

void AccessDatabase::revokeControlApplicationWithBundleIdentifier(const std::string& bundleIdentifier) {
  OVLogError(kTag, "Revoking Control BundleID {}", bundleIdentifier);
  execute(kTag, "DELETE FROM camera_control WHERE bundle_id IS ?;", {bundleIdentifier});
}

std::vector<Dictionary> AccessDatabase::rowsOf(const std::string& bundleIdentifier, Table table) {
  std::vector<Dictionary> rows;
  execute(kTag,
          std::string("SELECT bundle_id, date_added, whitelisted FROM ") + nameOf(table) +
              " WHERE bundle_id IS ?;",
          {bundleIdentifier},
          [&](const Database::Row& row) { rows.push_back(OVAcessStatusQueryCompletion(row)); });
  return rows;
}

std::vector<std::string> OVAcessQueryCompletion(const Database::Row& row) {
  std::vector<std::string> values;
  for (const auto& [column, value] : row) {
    if (!value) continue;
    OVLog("adding", "{}", *value);
    values.push_back(*value);
  }
  return values;
}

Dictionary OVAcessStatusQueryCompletion(const Database::Row& row) {
  Dictionary dictionary;
  for (std::size_t i = 0; i < row.size() && i < 3; ++i) {
    const auto& [column, value] = row[i];
    if (!value) continue;
    if (i == 0) {
      dictionary.set(column, *value);
    } else {
      std::int64_t number = 0;
      std::from_chars(value->data(), value->data() + value->size(), number);
      dictionary.set(column, number);
    }
  }
  return dictionary;
}

}  // namespace brivo
