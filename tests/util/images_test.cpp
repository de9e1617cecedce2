// SPDX-License-Identifier: MIT
#include "util/images.h"

#include <gtest/gtest.h>

#include "imaging/local_image_decoder.h"
#include "imaging/made_pictures.h"
#include "platform/images/image_reader.h"
#include "support/image_bytes.h"
#include "support/temporary_folder.h"

namespace brivo {
namespace {

using test::integer;
using test::madeJpeg;

/// A decoder of icons whose images have these widths; which image was asked for is its width.
class IconDecoder final : public ImageDecoder {
 public:
  explicit IconDecoder(std::vector<std::uint32_t> widths) : widths_(std::move(widths)) {}
  std::optional<Data> thumbnail(const UniqueFd&, const ThumbnailRequest&) override { return std::nullopt; }
  std::vector<std::uint32_t> imageWidths(const UniqueFd&) override { return widths_; }
  std::optional<Image> image(const UniqueFd&, std::uint32_t index) override {
    return index < widths_.size() ? std::optional(Image{widths_[index], 1, 1, {}}) : std::nullopt;
  }

 private:
  const std::vector<std::uint32_t> widths_;
};

/// Letters as pixels of grey, rows separated by blanks.
Image grey(const std::string& letters, std::uint32_t width) {
  return {width, static_cast<std::uint32_t>(letters.size()) / width, 1, Data::copyOf(letters)};
}

TEST(RotatedImageTest, EveryOrientationPutsThePixelsWhereTheyAreSeen) {
  const Image image = grey("abcdef", 3);  // abc above def
  const std::vector<std::string> upright{"abcdef", "cbafed", "fedcba", "defabc",
                                         "adbecf", "daebfc", "fcebda", "cfbead"};
  for (std::int32_t orientation = 1; orientation <= 8; ++orientation) {
    const auto rotated = OVCreateRotatedImage(orientation, image);
    ASSERT_TRUE(rotated);
    EXPECT_EQ(rotated->pixels.text(), upright[static_cast<std::size_t>(orientation - 1)]) << orientation;
    EXPECT_EQ(rotated->width, orientation < 5 ? 3u : 2u) << orientation;
    EXPECT_EQ(rotated->height, orientation < 5 ? 2u : 3u) << orientation;
  }
}

TEST(RotatedImageTest, Orientation6OfALandscapeImageYieldsAPortraitOne) {
  const Image image{4000, 3000, 4, Data(std::vector<std::byte>(std::size_t{4} * 4000 * 3000))};
  const auto rotated = OVCreateRotatedImage(6, image);
  ASSERT_TRUE(rotated);
  EXPECT_EQ(rotated->width, 3000u);
  EXPECT_EQ(rotated->height, 4000u);
  EXPECT_EQ(rotated->pixels.size(), image.pixels.size());
}

TEST(RotatedImageTest, UnknownOrientationsDrawUnrotated) {
  for (const std::int32_t orientation : {0, 9, -1}) {
    EXPECT_EQ(OVCreateRotatedImage(orientation, grey("abcdef", 3))->pixels.text(), "abcdef");
  }
  EXPECT_FALSE(OVCreateRotatedImage(6, std::nullopt));
}

TEST(RotatedImageTest, PixelsOfFourBytesStayTogether) {
  EXPECT_EQ(OVCreateRotatedImage(2, Image{2, 1, 4, Data::copyOf("argbARGB")})->pixels.text(), "ARGBargb");
}

class IconTest : public testing::Test {
 protected:
  IconTest() { test::writeFile(path, "icons"); }
  std::uint32_t widthFor(std::vector<std::uint32_t> widths, std::uint32_t size) {
    IconDecoder decoder(std::move(widths));
    const auto image = OVCreateThumbnailFromIconFile(decoder, &path, size);
    return image ? image->width : 0;
  }
  test::TemporaryFolder folder;
  const std::string path = folder / "app.ico";
};

TEST_F(IconTest, TheFirstImageThatIsNotWiderIsTaken) {
  EXPECT_EQ(widthFor({256, 64, 32}, 64), 64u);
  EXPECT_EQ(widthFor({32, 64}, 64), 32u) << "the first that fits, not the best";
  EXPECT_EQ(widthFor({256, 128}, 64), 256u) << "none fits: the first";
  EXPECT_EQ(widthFor({0, 256, 0, 48}, 64), 48u) << "images that tell no width are passed over";
}

TEST_F(IconTest, FewerThanTwoImagesYieldTheFirst) {
  EXPECT_EQ(widthFor({512}, 16), 512u);
  EXPECT_EQ(widthFor({}, 16), 0u);
}

TEST_F(IconTest, NothingIsYieldedWithoutAWidthAPathOrAFile) {
  EXPECT_EQ(widthFor({0, 0}, 16), 0u);
  IconDecoder decoder({16});
  EXPECT_FALSE(OVCreateThumbnailFromIconFile(decoder, nullptr, 16));
  const std::string missing = folder / "none.ico";
  EXPECT_FALSE(OVCreateThumbnailFromIconFile(decoder, &missing, 16));
}

class ThumbnailOfUrlTest : public testing::Test {
 protected:
  std::uint32_t widthOf(const std::string& content, std::int32_t maximum) {
    test::writeFile(folder / "a.jpg", content);
    const Url url = Url::file(folder / "a.jpg");
    const auto data = OVCreateJPEGThumbnailDataFromURL(decoder, &url, maximum);
    if (!data) return 0;
    return images::copySequentialProperties(images::MemorySource(data->bytes()))->size.width;
  }
  test::TemporaryFolder folder;
  LocalImageDecoder decoder;
};

TEST_F(ThumbnailOfUrlTest, AThumbnailThatTheFileHoldsIsPreferred) {
  EXPECT_EQ(widthOf(test::withExifThumbnail(madeJpeg(640, 480), madeJpeg(160, 120)), 320), 160u);
  EXPECT_EQ(widthOf(madeJpeg(640, 480), 320), 320u);
}

TEST_F(ThumbnailOfUrlTest, NothingIsYieldedForWhatCannotBeDecoded) {
  EXPECT_EQ(widthOf("no picture", 320), 0u);
  EXPECT_FALSE(OVCreateJPEGThumbnailDataFromURL(decoder, nullptr, 320));
  const Url missing = Url::file(folder / "none.jpg");
  EXPECT_FALSE(OVCreateJPEGThumbnailDataFromURL(decoder, &missing, 320));
}

}  // namespace
}  // namespace brivo
