// SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace brivo {

/// Makes localizedMessage() speak the language that the environment names (LANGUAGE, LC_ALL, LC_MESSAGES,
/// LANG). LANGUAGE counts even when the system lacks the locale that the others name. Not while other threads
/// run.
void speakLanguageOfUser();

/// The translation of `message` in a gettext domain whose catalogues are installed with the program; the
/// message itself when there is none, and before speakLanguageOfUser(). *Thread-safe.*
std::string localizedMessage(const char* domain, const std::string& message);

}  // namespace brivo
