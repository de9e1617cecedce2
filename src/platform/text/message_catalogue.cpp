// SPDX-License-Identifier: MIT
#include "platform/text/message_catalogue.h"

#include <libintl.h>
#include <unistd.h>

#include <clocale>
#include <mutex>
#include <set>

#include "platform/base/running_program.h"

namespace brivo {

namespace {

std::string catalogueFolder() {
  const std::string folder = runningProgramFolder() + BRIVOD_LOCALE_FROM_BIN_DIR;
  return ::access(folder.c_str(), X_OK) == 0 ? folder : BRIVOD_INSTALLED_LOCALE_DIR;
}

/// Domains are looked for in the system's folder until they are bound to ours.
void bindOnce(const char* domain) {
  static std::mutex mutex;
  static std::set<std::string> bound;
  const std::lock_guard lock(mutex);
  if (!bound.insert(domain).second) return;
  ::bindtextdomain(domain, catalogueFolder().c_str());
  ::bind_textdomain_codeset(domain, "UTF-8");
}

}  // namespace

void speakLanguageOfUser() {
  // gettext(3) does not translate in the locale "C", which is what remains when the named one is not there.
  for (const int category : {LC_CTYPE, LC_MESSAGES}) {
    if (!std::setlocale(category, "")) std::setlocale(category, "C.UTF-8");
  }
}

std::string localizedMessage(const char* domain, const std::string& message) {
  if (message.empty()) return {};  // the empty message is the catalogue's own header
  bindOnce(domain);
  return ::dgettext(domain, message.c_str());
}

}  // namespace brivo
