// SPDX-License-Identifier: MIT
// The grants of this user, as the subcommands of "access" see them.
#pragma once

#include <string>
#include <vector>

#include "access/access_database.h"
#include "brivoctl/command.h"
#include "platform/work/pool.h"

namespace brivoctl {

/// The access database of this user. A running service reads it for every new connection. *Thread-bound.*
class AccessFile {
 public:
  /// Makes the folder and the database when they are missing. Where that fails there are no grants, and
  /// storing one has no effect: see cannotStore().
  AccessFile();

  brivo::AccessDatabase& database() { return database_; }
  const std::string& folder() const { return folder_; }

 private:
  const std::string folder_;
  brivo::Pool pool_;
  brivo::AccessDatabase database_;
};

/// Says that a grant could not be stored there.
ExitCode cannotStore(const AccessFile& file);
/// Says that the grants there could not be read, and why.
ExitCode cannotRead(const AccessFile& file, const std::string& why);

struct Grant {
  std::string identifier;
  bool isGranted;  ///< false when it was never confirmed
};

/// One kind of grant. An application may have several of a kind. *Thread-bound.*
class Grants {
 public:
  virtual ~Grants() = default;

  virtual std::vector<Grant> list() = 0;
  /// Gives the application a grant that counts, once.
  virtual void grant(const std::string& identifier) = 0;
  virtual void revoke(const std::string& identifier) = 0;

  /// Whether there is a grant, confirmed or not.
  bool isKnown(const std::string& identifier);
  bool isGranted(const std::string& identifier);
};

/// To use the cameras.
class AccessGrants final : public Grants {
 public:
  explicit AccessGrants(brivo::AccessDatabase& database) : database_(database) {}

  std::vector<Grant> list() override;
  void grant(const std::string& identifier) override;
  void revoke(const std::string& identifier) override;

 private:
  brivo::AccessDatabase& database_;
};

/// To control the cameras. All that there are count.
class ControlGrants final : public Grants {
 public:
  explicit ControlGrants(brivo::AccessDatabase& database) : database_(database) {}

  std::vector<Grant> list() override;
  void grant(const std::string& identifier) override;
  void revoke(const std::string& identifier) override;

 private:
  brivo::AccessDatabase& database_;
};

}  // namespace brivoctl
