// SPDX-License-Identifier: MIT
#include "util/location.h"

#include <charconv>
#include <string_view>
#include <vector>

namespace brivo {

namespace {

/// The number that `text` begins with, 0 when it begins with none.
double leadingNumber(std::string_view text) {
  double number = 0;
  std::from_chars(text.data(), text.data() + text.size(), number);
  return number;
}

/// Each sign as 1 or 0, each number without its sign, in the order of the text.
std::vector<double> signsAndNumbers(std::string_view location) {
  std::vector<double> numbers;
  std::size_t start = 0;  // of the number behind the last sign
  for (std::size_t at = 0; at < location.size(); ++at) {
    const char separator = location[at];
    if (separator != '+' && separator != '-' && separator != '/') continue;
    if (at != 0) numbers.push_back(leadingNumber(location.substr(start, at - start)));
    if (separator == '/') continue;
    numbers.push_back(separator == '+' ? 1 : 0);
    start = at + 1;
  }
  return numbers;
}

}  // namespace

void OVCreateGPSDictionaryFromString(const std::string* location, Dictionary* properties) {
  if (!location || !properties) return;
  const std::vector<double> numbers = signsAndNumbers(*location);
  if (numbers.size() < 4) return;
  Dictionary gps{{"Latitude", numbers[1]},
                 {"LatitudeRef", numbers[0] < 1 ? "S" : "N"},
                 {"Longitude", numbers[3]},
                 {"LongitudeRef", numbers[2] < 1 ? "W" : "E"}};
  if (numbers.size() == 6) {
    gps.set("Altitude", numbers[5]);
    gps.set("AltitudeRef", 0.0);
  }
  properties->set("{GPS}", std::move(gps));
}

}  // namespace brivo
