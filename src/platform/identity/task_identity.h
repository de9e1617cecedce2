// SPDX-License-Identifier: MIT
// Who a client is.
#pragma once

#include <optional>
#include <string>

#include "platform/applications/installed_applications.h"
#include "platform/identity/audit_token.h"

namespace brivo {

/// Finds the identifier of a peer's application. For an unsandboxed program it is a label and no boundary: a
/// user's programs can pass themselves off as each other; docs/access.md says more. *Thread-safe.*
class TaskIdentity {
 public:
  /// `applications` must outlive this.
  explicit TaskIdentity(const InstalledApplications& applications) : applications_(applications) {}

  /// The first of: the Flatpak application id (/.flatpak-info in the peer's root), the snap name (security
  /// label), the id of the desktop file whose program the peer runs, the absolute path of its executable.
  /// None when the process has ended, or may be another one by now, or cannot be looked at; when its sandbox
  /// does not say clearly which application it is, or it cannot be told whether it has one; and when its
  /// executable cannot be found by its path, because it was removed or replaced, or because the path is one
  /// of another mount namespace.
  std::optional<std::string> codeSigningIdentifier(const AuditToken& token) const;

 private:
  std::optional<std::string> identifierOf(int process) const;
  std::optional<std::string> identifierOfProgram(int process) const;

  const InstalledApplications& applications_;
};

}  // namespace brivo
