// SPDX-License-Identifier: MIT
#include "platform/images/exif_names.h"

#include <algorithm>
#include <array>
#include <span>

namespace brivo::images {

namespace {

struct Name {
  std::uint16_t tag;
  std::string_view name;
};

constexpr std::array<Name, 26> kTiff{{
    {0x0100, "ImageWidth"},
    {0x0101, "ImageLength"},
    {0x0102, "BitsPerSample"},
    {0x0103, "Compression"},
    {0x0106, "PhotometricInterpretation"},
    {0x010D, "DocumentName"},
    {0x010E, "ImageDescription"},
    {0x010F, "Make"},
    {0x0110, "Model"},
    {0x0112, "Orientation"},
    {0x0115, "SamplesPerPixel"},
    {0x011A, "XResolution"},
    {0x011B, "YResolution"},
    {0x011C, "PlanarConfiguration"},
    {0x0128, "ResolutionUnit"},
    {0x012D, "TransferFunction"},
    {0x0131, "Software"},
    {0x0132, "DateTime"},
    {0x013B, "Artist"},
    {0x013C, "HostComputer"},
    {0x013E, "WhitePoint"},
    {0x013F, "PrimaryChromaticities"},
    {0x0211, "YCbCrCoefficients"},
    {0x0213, "YCbCrPositioning"},
    {0x0214, "ReferenceBlackWhite"},
    {0x8298, "Copyright"},
}};

constexpr std::array<Name, 81> kExif{{
    {0x0132, "DateTime"},
    {0x829A, "ExposureTime"},
    {0x829D, "FNumber"},
    {0x8822, "ExposureProgram"},
    {0x8824, "SpectralSensitivity"},
    {0x8827, "PhotographicSensitivity"},
    {0x8828, "OECF"},
    {0x8830, "SensitivityType"},
    {0x8831, "StandardOutputSensitivity"},
    {0x8832, "RecommendedExposureIndex"},
    {0x8833, "ISOSpeed"},
    {0x8834, "ISOSpeedLatitudeyyy"},
    {0x8835, "ISOSpeedLatitudezzz"},
    {0x9000, "ExifVersion"},
    {0x9003, "DateTimeOriginal"},
    {0x9004, "DateTimeDigitized"},
    {0x9010, "OffsetTime"},
    {0x9011, "OffsetTimeOriginal"},
    {0x9012, "OffsetTimeDigitized"},
    {0x9101, "ComponentsConfiguration"},
    {0x9102, "CompressedBitsPerPixel"},
    {0x9201, "ShutterSpeedValue"},
    {0x9202, "ApertureValue"},
    {0x9203, "BrightnessValue"},
    {0x9204, "ExposureBiasValue"},
    {0x9205, "MaxApertureValue"},
    {0x9206, "SubjectDistance"},
    {0x9207, "MeteringMode"},
    {0x9208, "LightSource"},
    {0x9209, "Flash"},
    {0x920A, "FocalLength"},
    {0x9214, "SubjectArea"},
    {0x9286, "UserComment"},
    {0x9290, "SubSecTime"},
    {0x9291, "SubSecTimeOriginal"},
    {0x9292, "SubSecTimeDigitized"},
    {0x9400, "Temperature"},
    {0x9401, "Humidity"},
    {0x9402, "Pressure"},
    {0x9403, "WaterDepth"},
    {0x9404, "Acceleration"},
    {0x9405, "CameraElevationAngle"},
    {0xA000, "FlashpixVersion"},
    {0xA001, "ColorSpace"},
    {0xA002, "PixelXDimension"},
    {0xA003, "PixelYDimension"},
    {0xA004, "RelatedSoundFile"},
    {0xA20B, "FlashEnergy"},
    {0xA20C, "SpatialFrequencyResponse"},
    {0xA20E, "FocalPlaneXResolution"},
    {0xA20F, "FocalPlaneYResolution"},
    {0xA210, "FocalPlaneResolutionUnit"},
    {0xA214, "SubjectLocation"},
    {0xA215, "ExposureIndex"},
    {0xA217, "SensingMethod"},
    {0xA300, "FileSource"},
    {0xA301, "SceneType"},
    {0xA302, "CFAPattern"},
    {0xA401, "CustomRendered"},
    {0xA402, "ExposureMode"},
    {0xA403, "WhiteBalance"},
    {0xA404, "DigitalZoomRatio"},
    {0xA405, "FocalLengthIn35mmFilm"},
    {0xA406, "SceneCaptureType"},
    {0xA407, "GainControl"},
    {0xA408, "Contrast"},
    {0xA409, "Saturation"},
    {0xA40A, "Sharpness"},
    {0xA40B, "DeviceSettingDescription"},
    {0xA40C, "SubjectDistanceRange"},
    {0xA420, "ImageUniqueID"},
    {0xA430, "CameraOwnerName"},
    {0xA431, "BodySerialNumber"},
    {0xA432, "LensSpecification"},
    {0xA433, "LensMake"},
    {0xA434, "LensModel"},
    {0xA435, "LensSerialNumber"},
    {0xA460, "CompositeImage"},
    {0xA461, "SourceImageNumberOfCompositeImage"},
    {0xA462, "SourceExposureTimesOfCompositeImage"},
    {0xA500, "Gamma"},
}};

constexpr std::array<Name, 32> kGps{{
    {0x0000, "VersionID"},       {0x0001, "LatitudeRef"},
    {0x0002, "Latitude"},        {0x0003, "LongitudeRef"},
    {0x0004, "Longitude"},       {0x0005, "AltitudeRef"},
    {0x0006, "Altitude"},        {0x0007, "TimeStamp"},
    {0x0008, "Satellites"},      {0x0009, "Status"},
    {0x000A, "MeasureMode"},     {0x000B, "DOP"},
    {0x000C, "SpeedRef"},        {0x000D, "Speed"},
    {0x000E, "TrackRef"},        {0x000F, "Track"},
    {0x0010, "ImgDirectionRef"}, {0x0011, "ImgDirection"},
    {0x0012, "MapDatum"},        {0x0013, "DestLatitudeRef"},
    {0x0014, "DestLatitude"},    {0x0015, "DestLongitudeRef"},
    {0x0016, "DestLongitude"},   {0x0017, "DestBearingRef"},
    {0x0018, "DestBearing"},     {0x0019, "DestDistanceRef"},
    {0x001A, "DestDistance"},    {0x001B, "ProcessingMethod"},
    {0x001C, "AreaInformation"}, {0x001D, "DateStamp"},
    {0x001E, "Differential"},    {0x001F, "HPositioningError"},
}};

static_assert(std::ranges::is_sorted(kTiff, {}, &Name::tag) &&
              std::ranges::is_sorted(kExif, {}, &Name::tag) && std::ranges::is_sorted(kGps, {}, &Name::tag));

std::span<const Name> namesOf(ExifGroup group) {
  switch (group) {
    case ExifGroup::exif:
      return kExif;
    case ExifGroup::tiff:
      return kTiff;
    case ExifGroup::gps:
      return kGps;
    case ExifGroup::makerNote:
      break;  // its tags have numbers for names
  }
  return {};
}

}  // namespace

std::string_view nameOfTag(ExifGroup group, std::uint16_t tag) {
  const auto names = namesOf(group);
  const auto place = std::ranges::lower_bound(names, tag, {}, &Name::tag);
  return place != names.end() && place->tag == tag ? place->name : std::string_view();
}

std::optional<std::uint16_t> tagOfName(ExifGroup group, std::string_view name) {
  const auto names = namesOf(group);
  const auto place = std::ranges::find(names, name, &Name::name);
  return place != names.end() ? std::optional(place->tag) : std::nullopt;
}

}  // namespace brivo::images
