// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <limits>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <variant>

#include "content/brivo_item.h"
#include "content/media/metadata_archive.h"
#include "content/media/sub_images.h"
#include "io/buffer_cache.h"
#include "io/file_stream.h"

namespace brivo {

class MovieAsset;

/// A four-character code as a number, first character highest.
constexpr std::uint32_t fourCharacterCode(const char (&code)[5]) {
  std::uint32_t value = 0;
  for (int i = 0; i < 4; ++i) value = value << 8 | static_cast<std::uint8_t>(code[i]);
  return value;
}

inline constexpr std::uint32_t kTypeImage = fourCharacterCode("imag");
inline constexpr std::uint32_t kTypeMovie = fourCharacterCode("moov");
inline constexpr std::uint32_t kTypeAudio = fourCharacterCode("audo");
inline constexpr std::uint32_t kTypeOther = fourCharacterCode("othe");

/// A regular file on a volume. Its kind is decided once, from the extension of its name; what a picture says
/// of itself is read once, when the file is made or, for raw files where speed is wanted, in an operation of
/// the device. The stream operations are *thread-safe*; everything that reads metadata, and the buffer cache,
/// belong to the device's operations once the file is made; the rest as in BrivoItem.
class BrivoFile final : public BrivoItem, public ReadAheadSource {
  struct MakingKey {};

 public:
  /// Only for the functions below.
  template <class... Arguments>
  explicit BrivoFile(MakingKey, Arguments&&... arguments)
      : BrivoItem(std::forward<Arguments>(arguments)...) {}

  /// Makes the item of the file at `path`; null, with no handle taken, when the file system cannot tell its
  /// values. `prefetched` spares asking it.
  static std::shared_ptr<BrivoFile> initWithFSURL(std::string path, std::string name, const BrivoItem* parent,
                                                  CameraDevice& device,
                                                  const ResourceValues* prefetched = nullptr);
  /// A file that is only to be read: no handle, no kind. Its path is the parent's path directly followed by
  /// `name`, so the parent's must end with a separator. Null when there is no such file.
  static std::shared_ptr<BrivoFile> initForReadingOnlyWithName(std::string name, const BrivoItem& parent,
                                                               CameraDevice& device);

  const std::string& name() const override { return BrivoItem::name(); }
  std::uint64_t size() const override { return BrivoItem::size(); }

  bool hasThumbnail() const { return hasThumbnail_; }
  /// Keeps the dataset honest: "yes" turns a thumbnail size of 0 into 1, which marks a thumbnail whose size
  /// is not known yet; "no" sets the size to 0.
  void setHasThumbnail(bool value);
  bool hasMetadata() const { return hasMetadata_; }
  void setHasMetadata(bool value) { hasMetadata_ = value; }
  /// Identifier of the generic type class: image, movie, audio or data.
  std::string_view Tevo() const;

  // What lives in the dataset. Sizes and positions in bytes, widths and heights in pixels.
  std::uint32_t thumbSize() const { return info().thumbCompressedSize(); }
  void setThumbSize(std::uint32_t bytes) { mutableInfo().setThumbCompressedSize(bytes); }
  std::uint32_t thumbOffset() const { return info().thumbOffset(); }
  void setThumbOffset(std::uint32_t bytes) { mutableInfo().setThumbOffset(bytes); }
  std::uint32_t thumbWidth() const { return info().thumbPixWidth(); }
  void setThumbWidth(std::uint32_t pixels) { mutableInfo().setThumbPixWidth(pixels); }
  std::uint32_t thumbHeight() const { return info().thumbPixHeight(); }
  void setThumbHeight(std::uint32_t pixels) { mutableInfo().setThumbPixHeight(pixels); }
  std::uint32_t imageWidth() const { return info().imagePixWidth(); }
  void setImageWidth(std::uint32_t pixels) { mutableInfo().setImagePixWidth(pixels); }
  std::uint32_t imageHeight() const { return info().imagePixHeight(); }
  void setImageHeight(std::uint32_t pixels) { mutableInfo().setImagePixHeight(pixels); }
  /// EXIF orientation, 1 to 8; 0 when it is not known. The setter keeps the low 16 bits.
  std::uint32_t imageOrientation() const { return info().imageOrietation(); }
  void setImageOrientation(std::uint32_t value) {
    mutableInfo().setImageOrietation(static_cast<std::uint16_t>(value));
  }

  /// The image decoders read files with this extension (in any letter case).
  bool pixelorSupported() const;
  /// The file counts as a camera raw file: registered as one, not "tif", and not excluded by
  /// hasValidInformation().
  bool rawImageSupported() const;
  /// False for the extensions, in any letter case, whose raw files are not taken as such.
  static bool hasValidInformation(std::string_view extension);

  /// Reads what the catalogue shows of the file: for images the size, the orientation, the embedded thumbnail
  /// and with them the metadata. Once; later calls do nothing. Raw files have rawImageMinimumProperties().
  void updateBasicMetadata();
  /// The same for raw files: displayed size, orientation and the embedded previews.
  void rawImageMinimumProperties();
  /// True when updateBasicMetadata() has run, and when the metadata dictionary has been built.
  bool updatedBasicMetadata() const { return updatedBasicMetadata_; }
  bool updatedExpensiveMetadata() const { return updatedExpensiveMetadata_; }

  /// Runs the basic pass, builds the dictionary unless there is one, and answers with it.
  void metadataWithOptions(const Dictionary& options, const ResultHandler& reply) override;
  /// The metadata dictionary, built by the first call; empty when it could not be. None when there never was
  /// one to build.
  std::optional<Dictionary> metadataDict();
  /// What is kept of it already.
  std::optional<Dictionary> metadata() const;
  /// Fills the dictionary and the dataset from the properties of an image; false when they give no usable
  /// metadata. `hasExif`: they count as EXIF.
  bool processMetadata(const std::optional<images::ImageProperties>& properties, bool hasExif);
  /// Sets orientation, width and height from a dictionary of image properties. For images on their side the
  /// dataset and the dictionary get the size as it is shown.
  void setSizeAndOrientationFromImageProperties(Dictionary& properties);

  // Dates of the picture as EXIF has them, and in seconds since 1970; none before the metadata have been
  // read.
  std::optional<std::string> exifCreationDateTime() const;
  std::optional<std::string> exifModificationDateTime() const;
  std::optional<std::int64_t> exifCreationDate() const;
  std::optional<std::int64_t> exifModificationDate() const;

  /// Finished JPEGs in the file, by width.
  const SubImages& subImages() const { return subImages_; }
  /// As validatedSubImage(), and notes what kind of image was found: a width of 160 pixels is the thumbnail
  /// that the dataset tells of.
  std::optional<SubImage> rawImageValidateSubImage(const SubImage* description, Error* error = nullptr);
  /// Adds a validated description unless there is one of its width.
  void addSubImageDict(const SubImage& image);
  /// The narrowest image of at least that width; none when all are narrower.
  std::optional<SubImage> subImageDictForPixelWidth(std::uint32_t width) const;

  /// Answers once, with the metadata, the orientation, and a JPEG of at least the wanted width, as far as
  /// there are any. The JPEG is not rotated.
  void thumbnailDataWithOptions(const Dictionary& options, const ResultHandler& reply) override;
  /// A JPEG that is `width` pixels wide or wider where the file holds one, else one whose longer side is
  /// `width` pixels, or that of the image when it is shorter; 0: the smallest in the file, else the image in
  /// its size.
  std::optional<Data> thumbnailDataForPixelWidth(std::uint32_t width);
  std::optional<Data> imageThumbnailDataForPixelWidth(std::uint32_t width);
  /// A JPEG of a movie's first frame, at most `width` pixels wide, and smaller than the frame when that is
  /// more than it has; 0: in its size.
  std::optional<Data> movieThumbnailDataForPixelWidth(std::uint32_t width) const;
  /// The bytes of an embedded JPEG, unchanged; none when they are not in the file or do not begin as one.
  std::optional<Data> createThumbnailUsingOffsets(const SubImage& image);
  /// A JPEG of the decoded image.
  std::optional<Data> createImageDataForPixelWidth(std::uint32_t width) const;
  /// The whole file beside this one that has its name with the extension "THM".
  std::optional<Data> thumbnailDataUsingSidecarFiles() const;
  /// The file's bytes, as many as the low 32 bits of its size say.
  std::optional<Data> imageData();
  /// Always none.
  static std::optional<Dictionary> exifThumbOffsets() { return std::nullopt; }

  /// A small embedded image has been found, and a large one.
  bool smallThumbnail() const { return smallThumbnail_; }
  bool previewThumbnail() const { return previewThumbnail_; }
  /// Orders items by handle: -1, 0 or 1. The context is not used.
  static int compare(const BrivoItem& item, const BrivoItem& against, const void* context);

  /// True for a read that gave as many bytes as were asked for, neither 0 nor the failure marker.
  static bool validateReturnDataSize(std::int64_t returned, std::int64_t requested);

  /// Opens the file for one more reader; false when the device is being ejected. A file that cannot be opened
  /// counts as open, and its reads fail.
  bool openStream();
  /// Ends one reader; true when this closed the descriptor.
  bool closeStream();
  /// Bytes read into `buffer` from `offset` on, not beyond the file's size; 0 when no stream is open, -1 when
  /// the medium failed.
  std::int64_t readStream(std::span<std::byte> buffer, std::uint64_t offset) const override;
  /// Maps `length` bytes from `offset` on for reading, zeros where the medium fails; null when no stream is
  /// open or the file cannot be mapped.
  std::unique_ptr<ProtectedMapping> readMap(std::size_t length, std::uint64_t offset) const;
  /// Unmaps; false, with the mapping left alone, when there is none or the device is being ejected.
  bool closeMap(std::unique_ptr<ProtectedMapping>& map) const;
  std::uint32_t fileOpenCount() const { return stream_.streamCount(); }

  /// Begins to read ahead from the start of the file, in a new cache in place of one that is there; without
  /// memory for it there is none.
  void createBufferCache();
  void destroyBufferCache() { bufferCache_.reset(); }
  /// Null when there is none.
  OVBufferCache* bufferCache() const { return bufferCache_.get(); }

 private:
  void decideKind();
  static void readFirstMetadata(const std::shared_ptr<BrivoFile>& file);
  void readCheapProperties(std::string_view extension);
  void readMovieProperties();
  void buildMovieMetadata();
  void fillMovieMetadata(MovieAsset& asset, Dictionary& result) const;
  void fillMovieSize(MovieAsset& asset, Dictionary& result) const;
  std::shared_ptr<MovieAsset> openMovie() const;
  void buildImageMetadata();
  bool keepMetadata(const images::ImageProperties& properties);
  std::optional<std::uint32_t> orientationFrom(const images::ImageProperties& properties);
  void setEmbeddedThumbnail(const images::EmbeddedImage& thumbnail);
  void readRawProperties(const Dictionary& raw, Dictionary& properties);
  std::optional<ImageMetadata> imageMetadata() const;
  std::optional<Data> readInside(std::uint32_t offset, std::uint32_t length) const;

  FileStream stream_;
  SubImages subImages_;
  /// None, a picture's, or any other.
  std::variant<std::monostate, ArchivedMetadata, Dictionary> metadata_;
  bool hasThumbnail_ = false;
  bool hasMetadata_ = false;
  bool updatedBasicMetadata_ = false;
  bool updatedExpensiveMetadata_ = false;
  bool smallThumbnail_ = false;
  bool previewThumbnail_ = false;
  std::unique_ptr<OVBufferCache> bufferCache_;  // last: it reads from the stream
};

/// Orientation, width and height at the top of a dictionary of image properties: 1 when no orientation is
/// there; none for a size that is not there. The size of a raw image's sensor comes before that of the
/// picture.
struct ImageDimensions {
  std::int64_t orientation = 1;
  std::optional<std::uint64_t> width;
  std::optional<std::uint64_t> height;
};
ImageDimensions OVGetDimensionsFromImageProperties(const Dictionary& properties);

}  // namespace brivo
