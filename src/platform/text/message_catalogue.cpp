// SPDX-License-Identifier: MIT
#include "platform/text/message_catalogue.h"

#include <libintl.h>

#include <mutex>
#include <set>

namespace brivo {

namespace {

/// Domains are looked for in the system's folder until they are bound to ours.
void bindOnce(const char* domain) {
  static std::mutex mutex;
  static std::set<std::string> bound;
  const std::lock_guard lock(mutex);
  if (!bound.insert(domain).second) return;
  ::bindtextdomain(domain, BRIVOD_INSTALLED_LOCALE_DIR);
  ::bind_textdomain_codeset(domain, "UTF-8");
}

}  // namespace

std::string localizedMessage(const char* domain, const std::string& message) {
  if (message.empty()) return {};  // the empty message is the catalogue's own header
  bindOnce(domain);
  return ::dgettext(domain, message.c_str());
}

}  // namespace brivo
