// SPDX-License-Identifier: MIT
#include "raw_file.h"

#include <array>
#include <cstdint>
#include <filesystem>
#include <span>
#include <vector>

#include "support/image_bytes.h"
#include "support/temporary_folder.h"

namespace brivo::bench {

namespace {

constexpr std::uint32_t kWidth = 6000, kHeight = 4000;
constexpr std::uint32_t kSensorBytes = kWidth * kHeight * 2;

// Where things are. A directory has room for 20 fields.
constexpr std::uint32_t kMakeAt = 0x20, kModelAt = 0x40, kSubDirectoriesAt = 0x80;
constexpr std::uint32_t kMainDirectory = 0x100, kSecondDirectory = 0x200, kFirstSubDirectory = 0x300;
constexpr std::uint32_t kDirectoryBytes = 0x100;
constexpr std::uint32_t kSensorAt = 5 * 1024 * 1024;

constexpr std::uint16_t kShort = 3, kLong = 4, kByte = 1, kAscii = 2;

struct Jpeg {
  std::uint32_t offset, length;
  unsigned width, height;
};
constexpr Jpeg kThumbnail{0x2000, 8'400, 160, 120};
constexpr std::array<Jpeg, 3> kPreviews{Jpeg{64 * 1024, 80'000, 640, 427},
                                        Jpeg{256 * 1024, 400'000, 1620, 1080},
                                        Jpeg{1024 * 1024, 3'000'000, kWidth, kHeight}};
static_assert(kPreviews.size() + 1 == kJpegsOfRawFile);

struct Field {
  std::uint16_t tag, type;
  std::uint32_t count, value;
};

class Bytes {
 public:
  void put(std::uint32_t offset, std::string_view bytes) {
    if (bytes_.size() < offset + bytes.size()) bytes_.resize(offset + bytes.size());
    bytes_.replace(offset, bytes.size(), bytes);
  }
  void directory(std::uint32_t offset, std::span<const Field> fields, std::uint32_t next = 0) {
    std::string bytes = test::integer(fields.size(), 2);
    for (const Field& field : fields) {
      bytes += test::integer(field.tag, 2) + test::integer(field.type, 2) + test::integer(field.count, 4) +
               test::integer(field.value, 4);
    }
    put(offset, bytes + test::integer(next, 4));
  }
  void jpeg(const Jpeg& jpeg) { put(jpeg.offset, test::jpeg(jpeg.width, jpeg.height)); }
  const std::string& all() const { return bytes_; }

 private:
  std::string bytes_;
};

constexpr std::uint32_t subDirectory(std::uint32_t index) {
  return kFirstSubDirectory + index * kDirectoryBytes;
}

void putMain(Bytes& bytes) {
  constexpr std::string_view kMake("NIKON CORPORATION\0", 18), kModel("NIKON D3X\0", 10);
  bytes.put(0, "II" + test::integer(42, 2) + test::integer(kMainDirectory, 4));
  bytes.put(kMakeAt, kMake);
  bytes.put(kModelAt, kModel);
  for (std::uint32_t i = 0; i <= kPreviews.size(); ++i)
    bytes.put(kSubDirectoriesAt + 4 * i, test::integer(subDirectory(i), 4));
  bytes.directory(kMainDirectory,
                  std::array<Field, 7>{{{0x00FE, kLong, 1, 1},
                                        {0x0100, kLong, 1, kThumbnail.width},
                                        {0x0101, kLong, 1, kThumbnail.height},
                                        {0x010F, kAscii, kMake.size(), kMakeAt},
                                        {0x0110, kAscii, kModel.size(), kModelAt},
                                        {0x0112, kShort, 1, 6},
                                        {0x014A, kLong, kPreviews.size() + 1, kSubDirectoriesAt}}},
                  kSecondDirectory);
}

void putJpeg(Bytes& bytes, std::uint32_t directory, const Jpeg& jpeg) {
  bytes.directory(directory, std::array<Field, 4>{{{0x00FE, kLong, 1, 1},
                                                   {0x0103, kShort, 1, 6},
                                                   {0x0201, kLong, 1, jpeg.offset},
                                                   {0x0202, kLong, 1, jpeg.length}}});
  bytes.jpeg(jpeg);
}

void putSensor(Bytes& bytes, std::uint32_t directory) {
  constexpr std::uint16_t kColourFilterArray = 32'803;
  bytes.directory(directory, std::array<Field, 12>{{{0x00FE, kLong, 1, 0},
                                                    {0x0100, kLong, 1, kWidth},
                                                    {0x0101, kLong, 1, kHeight},
                                                    {0x0102, kShort, 1, 16},
                                                    {0x0103, kShort, 1, 1},
                                                    {0x0106, kShort, 1, kColourFilterArray},
                                                    {0x0111, kLong, 1, kSensorAt},
                                                    {0x0115, kShort, 1, 1},
                                                    {0x0116, kLong, 1, kHeight},
                                                    {0x0117, kLong, 1, kSensorBytes},
                                                    {0x828D, kShort, 2, 0x0002'0002},
                                                    {0x828E, kByte, 4, 0x0201'0100}}});
}

}  // namespace

void makeRawFile(const std::string& path) {
  Bytes bytes;
  putMain(bytes);
  putJpeg(bytes, kSecondDirectory, kThumbnail);
  for (std::uint32_t i = 0; i < kPreviews.size(); ++i) putJpeg(bytes, subDirectory(i), kPreviews.at(i));
  putSensor(bytes, subDirectory(kPreviews.size()));
  test::writeFile(path, bytes.all());
  std::filesystem::resize_file(path, std::uint64_t{kSensorAt} + kSensorBytes);
}

}  // namespace brivo::bench
