// SPDX-License-Identifier: MIT
#include "ptp/code_tables.h"

#include <algorithm>
#include <array>

namespace brivo {

std::span<const PTPCodeTable> allPTPCodeTables() {
  static const std::array tables{
      PTPCodeTable{"operation", operationCodes()},
      PTPCodeTable{"response", responseCodes()},
      PTPCodeTable{"event", eventCodes()},
      PTPCodeTable{"device property", devicePropCodes()},
      PTPCodeTable{"object format", objectFormatCodes()},
      PTPCodeTable{"vendor property", canonProperties()},
      PTPCodeTable{"vendor property", canonPropertiesElsewhere()},
      PTPCodeTable{"functional mode", functionalModes()},
      PTPCodeTable{"storage type", storageTypes()},
      PTPCodeTable{"file-system type", filesystemTypes()},
      PTPCodeTable{"access capability", accessCapabilities()},
      PTPCodeTable{"protection status", protectionStatuses()},
      PTPCodeTable{"association type", associationTypes()},
      PTPCodeTable{"initialisation failure", initFailReasons()},
  };
  return tables;
}

const char* nameOfPTPCode(std::span<const PTPCodeName> table, std::uint32_t code) {
  const auto row = std::ranges::find(table, code, &PTPCodeName::code);
  return row == table.end() ? nullptr : row->name;
}

}  // namespace brivo
