// SPDX-License-Identifier: MIT
#include "imaging/movie_bytes.h"

#include "iso_bytes.h"

namespace brivo::test {

namespace {

constexpr unsigned kTimeScale = 10;

std::string zeros(std::size_t count) { return std::string(count, '\0'); }

std::string matrixBytes(const TrackMatrix& matrix) {
  std::string bytes;
  for (const std::int32_t element : matrix) bytes += big(static_cast<std::uint32_t>(element), 4);
  return bytes;
}

std::string trackHeader(const TrackBytes& track, unsigned id, unsigned duration) {
  return fullBox("tkhd", 0, 7,
                 zeros(8) + big(id, 4) + zeros(4) + big(duration, 4) + zeros(16) + matrixBytes(track.matrix) +
                     big(track.width, 2) + zeros(2) + big(track.height, 2) + zeros(2));
}

std::string visualEntry(const TrackBytes& track) {
  return box(track.format, zeros(6) + big(1, 2) + zeros(16) + big(track.width, 2) + big(track.height, 2) +
                               big(0x480000, 4) + big(0x480000, 4) + zeros(4) + big(1, 2) + zeros(32) +
                               big(24, 2) + big(0xFFFF, 2) + track.entryBoxes);
}

std::string soundEntry(const TrackBytes& track) {
  return box(track.format,
             zeros(6) + big(1, 2) + zeros(8) + big(1, 2) + big(16, 2) + zeros(4) + big(8000, 2) + zeros(2));
}

std::size_t sampleCount(const TrackBytes& track) { return track.samples.size() * track.listings; }

std::string sampleTable(const TrackBytes& track, std::uint64_t start) {
  const std::size_t count = sampleCount(track);
  std::string lengths;
  std::string places;
  for (const std::string& sample : track.samples) {
    for (std::size_t i = 0; i < track.listings; ++i) {
      lengths += big(sample.size(), 4);
      places += big(start, 8);
    }
    start += sample.size();
  }
  const std::string entry = track.handler == "vide" ? visualEntry(track) : soundEntry(track);
  const std::string whole = track.isFirstAloneWhole ? fullBox("stss", 0, 0, big(1, 4) + big(1, 4)) : "";
  return box("stbl", fullBox("stsd", 0, 0, big(1, 4) + entry) +
                         fullBox("stts", 0, 0, big(1, 4) + big(count, 4) + big(1, 4)) + whole +
                         fullBox("stsc", 0, 0, big(1, 4) + big(1, 4) + big(1, 4) + big(1, 4)) +
                         fullBox("stsz", 0, 0, zeros(4) + big(count, 4) + lengths) +
                         fullBox("co64", 0, 0, big(count, 4) + places));
}

std::string trackBox(const TrackBytes& track, unsigned id, unsigned duration, std::uint64_t start) {
  const std::string handler = fullBox("hdlr", 0, 0, "mhlr" + std::string(track.handler) + zeros(13));
  const std::string header = fullBox(
      "mdhd", 0, 0, zeros(8) + big(kTimeScale, 4) + big(sampleCount(track), 4) + big(0x55C4, 2) + zeros(2));
  const std::string references = box("dinf", fullBox("dref", 0, 0, big(1, 4) + fullBox("url ", 0, 1, "")));
  const std::string media =
      box("mdia", header + handler + box("minf", references + sampleTable(track, start)));
  return box("trak", trackHeader(track, id, duration) + track.editBox + media);
}

std::string movieHeader(unsigned duration, std::size_t tracks) {
  return fullBox("mvhd", 0, 0,
                 zeros(8) + big(kTimeScale, 4) + big(duration, 4) + big(0x10000, 4) + big(0x100, 2) +
                     zeros(10) + matrixBytes(matrixOf(1, 0, 0, 1)) + zeros(24) + big(tracks + 1, 4));
}

}  // namespace

TrackMatrix matrixOf(int a, int b, int c, int d, int x, int y) {
  return {a * kOne16, b * kOne16, 0, c * kOne16, d * kOne16, 0, x * kOne16, y * kOne16, kOne30};
}

std::string MovieBytes::index(std::uint64_t start) const {
  std::string content = movieHeader(duration, tracks.size());
  unsigned id = 1;
  for (const TrackBytes& track : tracks) {
    content += trackBox(track, id++, duration, start);
    for (const std::string& sample : track.samples) start += sample.size();
  }
  if (!userData.empty()) content += box("udta", userData);
  return box("moov", content + metaBox);
}

std::string MovieBytes::samples() const {
  std::string bytes;
  for (const TrackBytes& track : tracks) {
    for (const std::string& sample : track.samples) bytes += sample;
  }
  return bytes;
}

std::string MovieBytes::beginning(std::uint64_t padding) const {
  const std::string content = samples();
  // With a 64-bit length.
  return fileType(brand) + big(1, 4) + "mdat" + big(16 + content.size() + padding, 8) + content;
}

std::string MovieBytes::build() const {
  if (isIndexLast) return beginning() + ending();
  const std::string whole = beginning();
  const std::size_t typeLength = fileType(brand).size();
  const std::size_t start = whole.size() - samples().size() + index(0).size();
  return whole.substr(0, typeLength) + index(start) + whole.substr(typeLength);
}

std::string cleanApertureBox(int width, int height, int x, int y) {
  std::string content;
  for (const int value : {width, height, x, y})
    content += big(static_cast<std::uint32_t>(value), 4) + big(1, 4);
  return box("clap", content);
}

std::string pixelShapeBox(unsigned horizontal, unsigned vertical) {
  return box("pasp", big(horizontal, 4) + big(vertical, 4));
}

std::string editBox(unsigned duration, unsigned start) {
  return box("edts", fullBox("elst", 0, 0, big(1, 4) + big(duration, 4) + big(start, 4) + big(0x10000, 4)));
}

std::string keysBox(const std::vector<std::pair<std::string, std::string>>& items) {
  std::string keys;
  std::string texts;
  unsigned number = 1;
  for (const auto& [key, text] : items) {
    keys += box("mdta", key);
    texts += box(big(number++, 4), box("data", big(1, 4) + zeros(4) + text));
  }
  const std::string handler = fullBox("hdlr", 0, 0, zeros(4) + "mdta" + zeros(13));
  return box("meta", handler + fullBox("keys", 0, 0, big(items.size(), 4) + keys) + box("ilst", texts));
}

std::string coverBox(const std::string& jpeg) {
  const std::string cover = box("covr", box("data", big(13, 4) + zeros(4) + jpeg));
  const std::string handler = fullBox("hdlr", 0, 0, zeros(4) + "mdir" + zeros(13));
  return fullBox("meta", 0, 0, handler + box("ilst", cover));
}

std::string userText(std::string_view type, std::string_view text) {
  return box("\xA9" + std::string(type), big(text.size(), 2) + zeros(2) + std::string(text));
}

}  // namespace brivo::test
