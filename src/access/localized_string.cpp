// SPDX-License-Identifier: MIT
#include "access/localized_string.h"

#include "platform/text/message_catalogue.h"

namespace brivo {

std::string OVLocalizedString(const std::string& key) { return localizedMessage("OrvidCore", key); }

}  // namespace brivo
