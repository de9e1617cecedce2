// SPDX-License-Identifier: MIT
#include "util/location.h"

#include <gtest/gtest.h>

namespace brivo {
namespace {

/// The "{GPS}" dictionary made of a text; empty when none was.
Dictionary gpsOf(const std::string& text) {
  Dictionary properties;
  OVCreateGPSDictionaryFromString(&text, &properties);
  const Dictionary* gps = properties.dictionary("{GPS}");
  return gps ? *gps : Dictionary();
}

TEST(Location, LatitudeAndLongitudeLoseTheirSignsToTheReferences) {
  const Dictionary gps = gpsOf("+37.3349-122.0090/");
  EXPECT_EQ(gps,
            (Dictionary{
                {"Latitude", 37.3349}, {"LatitudeRef", "N"}, {"Longitude", 122.009}, {"LongitudeRef", "W"}}));
  EXPECT_EQ(*gpsOf("-33.8+151.2/").string("LatitudeRef"), "S");
  EXPECT_EQ(*gpsOf("-33.8+151.2/").string("LongitudeRef"), "E");
}

TEST(Location, AnAltitudeIsGivenWithTheReferenceZeroWhateverItsSign) {
  for (const char* text : {"+37.3349-122.0090-010.000/", "+37.3349-122.0090+010.000/"}) {
    EXPECT_EQ(gpsOf(text).real("Altitude"), 10.0);
    EXPECT_EQ(gpsOf(text).real("AltitudeRef"), 0.0);
  }
}

TEST(Location, WithFewerThanTwoCoordinatesNothingIsStored) {
  for (const char* text : {"", "/", "+37.3349/", "37.3349-122.0090", "letters"}) {
    Dictionary properties{{"Other", 1}};
    const std::string location = text;
    OVCreateGPSDictionaryFromString(&location, &properties);
    EXPECT_EQ(properties, (Dictionary{{"Other", 1}})) << text;
  }
}

TEST(Location, MoreThanSixNumbersGiveNoAltitude) {
  const Dictionary gps = gpsOf("+37.3349-122.0090+010.000CRSWGS_84/x/");
  EXPECT_EQ(gps.real("Latitude"), 37.3349);
  EXPECT_FALSE(gps.contains("Altitude"));
}

TEST(Location, NothingHappensWithoutEitherArgument) {
  const std::string text = "+37.3349-122.0090/";
  Dictionary properties;
  OVCreateGPSDictionaryFromString(nullptr, &properties);
  OVCreateGPSDictionaryFromString(&text, nullptr);
  EXPECT_TRUE(properties.empty());
}

}  // namespace
}  // namespace brivo
