// SPDX-License-Identifier: MIT
#include <algorithm>
#include <iterator>

#include "ptp/code_names.h"

namespace brivo {

namespace {

/// ISO 15740, clause 5.3.
enum DataType : std::uint16_t {
  kUndefined = 0,
  kUint8 = 0x0002,
  kUint16 = 0x0004,
  kUint32 = 0x0006,
  kString = 0xFFFF
};

/// Properties from `first` to `last` have a type.
struct TypeRange {
  std::uint32_t first;
  std::uint32_t last;
  DataType type;
};

// clang-format off
constexpr TypeRange kTypes[] = {
    {0xD104, 0xD104, kUint8},
    {0xD107, 0xD107, kUint8},
    {0xD109, 0xD109, kUint8},
    {0xD110, 0xD110, kUint8},
    {0xD180, 0xD18A, kUint8},
    {0xD18E, 0xD191, kUint8},

    {0xD101, 0xD103, kUint16},
    {0xD105, 0xD106, kUint16},
    {0xD108, 0xD108, kUint16},
    {0xD10B, 0xD10C, kUint16},
    {0xD10F, 0xD10F, kUint16},
    {0xD111, 0xD112, kUint16},
    {0xD114, 0xD114, kUint16},
    {0xD119, 0xD11A, kUint16},
    {0xD11D, 0xD11D, kUint16},
    {0xD1A9, 0xD1A9, kUint16},
    {0xD1B0, 0xD1B1, kUint16},
    {0xD1D9, 0xD1D9, kUint16},

    {0xD10A, 0xD10A, kUint32},
    {0xD10D, 0xD10E, kUint32},
    {0xD113, 0xD113, kUint32},
    {0xD116, 0xD116, kUint32},
    {0xD11B, 0xD11C, kUint32},
    {0xD11E, 0xD11F, kUint32},
    {0xD17C, 0xD17C, kUint32},
    {0xD17E, 0xD17E, kUint32},
    {0xD194, 0xD194, kUint32},
    {0xD1A3, 0xD1A3, kUint32},
    {0xD1A8, 0xD1A8, kUint32},
    {0xD1AA, 0xD1AC, kUint32},
    {0xD1AE, 0xD1AE, kUint32},
    {0xD1B2, 0xD1B8, kUint32},
    {0xD1BA, 0xD1BB, kUint32},
    {0xD1C1, 0xD1C1, kUint32},
    {0xD1D4, 0xD1D5, kUint32},
    {0xD1DC, 0xD1DD, kUint32},

    {0xD115, 0xD115, kString},
    {0xD1AF, 0xD1AF, kString},
    {0xD1D0, 0xD1D1, kString},
    {0xD1D8, 0xD1D8, kString},
};
// clang-format on

}  // namespace

std::uint16_t ptpDataTypeForProperty(std::uint32_t property) {
  const auto* const range = std::ranges::find_if(
      kTypes, [&](const TypeRange& row) { return property >= row.first && property <= row.last; });
  return range == std::end(kTypes) ? kUndefined : range->type;
}

}  // namespace brivo
