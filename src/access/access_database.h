// SPDX-License-Identifier: MIT
// The persistent record of the applications that may access and control external cameras.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/base/value.h"
#include "platform/database/database.h"
#include "platform/work/serial_queue.h"

namespace brivo {

/// One SQLite file with a table per kind of grant. Every operation runs on one serial queue and returns when
/// it has run, so none may be called on that queue. Failures are logged and show as missing grants: lists are
/// then what was gathered before. *Thread-safe.*
class AccessDatabase {
 public:
  enum class Table { access, control };

  /// Opens or makes "externalMediaAccess.db" in `folder`, which is made when missing (not those above it),
  /// and brings an old file up to date. Without a usable file every operation finds nothing, after it has
  /// tried again to open one. A file that is removed or replaced later is opened, or made, anew.
  AccessDatabase(Pool& pool, std::string folder);
  ~AccessDatabase();
  AccessDatabase(const AccessDatabase&) = delete;
  AccessDatabase& operator=(const AccessDatabase&) = delete;

  std::vector<std::string> bundleIdentifiersAccessingExternalCameras();
  /// Dictionaries with "bundle_id" and, when it is not NULL, "whitelisted".
  std::vector<Dictionary> bundleIdentifiersAccessingExternalCamerasWithStatus();
  /// Adds a row each time, also when the application has one. `whitelist` marks a grant that needs no
  /// confirmation.
  void addApplicationWithBundleIdentifier(const std::string& bundleIdentifier, bool whitelist);
  void updateApplicationWithBundleIdentifier(const std::string& bundleIdentifier, bool status);
  /// Removes every row of the application.
  void revokeApplicationWithBundleIdentifier(const std::string& bundleIdentifier);

  std::vector<std::string> bundleIdentifiersControllingExternalCameras();
  void addControlApplicationWithBundleIdentifier(const std::string& bundleIdentifier, bool whitelisted);
  void revokeControlApplicationWithBundleIdentifier(const std::string& bundleIdentifier);

  /// The rows of one application: "bundle_id", "date_added" (seconds since 1970) and "whitelisted" where not
  /// NULL.
  std::vector<Dictionary> rowsOf(const std::string& bundleIdentifier, Table table);
  /// The engine's message when the grants of a kind cannot be read, so that none being found means nothing.
  std::optional<std::string> whyUnreadable(Table table);

 private:
  void open();
  void createTables();
  void reopenIfLost();
  /// Runs one statement on the queue: why it failed.
  std::optional<std::string> run(const std::string& statement,
                                 std::initializer_list<Database::Binding> bindings = {},
                                 const Database::RowHandler& onRow = nullptr);
  /// The same; what fails is logged under `tag`.
  void execute(const char* tag, const std::string& statement,
               std::initializer_list<Database::Binding> bindings = {},
               const Database::RowHandler& onRow = nullptr);
  std::vector<std::string> list(const char* tag, const std::string& statement);

  const std::string folder_;
  const std::shared_ptr<SerialQueue> deviceAccessQueue_;
  // On the queue only.
  std::unique_ptr<Database> database_;  // null when it could not be opened
  std::string openFailure_;             // what was wrong last time, to be told once
};

// One result row as the operations above return it.
/// The column values that are not NULL, as text; each is logged under "adding".
std::vector<std::string> OVAcessQueryCompletion(const Database::Row& row);
/// Column 0 as text, columns 1 and 2 as numbers, by their names; NULL columns are left out.
Dictionary OVAcessStatusQueryCompletion(const Database::Row& row);

}  // namespace brivo
