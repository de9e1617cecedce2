// SPDX-License-Identifier: MIT
#include "brivoctl/importer.h"

#include <fmt/core.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <vector>

#include "brivoctl/output.h"
#include "platform/base/paths.h"
#include "platform/digest/sha256.h"

namespace brivoctl {

namespace {

constexpr std::string_view kPartPrefix = ".orvid-import-";
constexpr std::string_view kPartSuffix = ".part";
constexpr std::size_t kChunk = 1'048'576;

/// The temporary name of an object's file, the same for every try.
std::string partName(const orvid::ObjectInfo& object) {
  const std::string identity =
      object.path + '\n' + std::to_string(object.size) + '\n' + std::to_string(object.modified);
  return std::string(kPartPrefix) + brivo::sha256Of(identity).substr(0, 16) + std::string(kPartSuffix);
}

/// "IMG_0001.JPG", then "IMG_0001-1.JPG", "IMG_0001-2.JPG" and so on.
std::string numberedName(const std::string& name, int number) {
  if (number == 0) return name;
  const std::string_view extension = brivo::pathExtension(name);
  return fmt::format("{}-{}{}{}", brivo::deletingPathExtension(name), number, extension.empty() ? "" : ".",
                     extension);
}

std::optional<std::string> textOf(const std::optional<brivo::SystemError>& error) {
  return error ? std::optional(error->text()) : std::nullopt;
}

}  // namespace

/// An object whose bytes are in its part file.
struct Importer::Copied {
  orvid::ObjectInfo object;
  std::unique_ptr<brivo::PartFile> part;
  std::string head;
  std::string sha256;
  std::string name;  // once it has one
};

Importer::Importer(Options options, ImportReceipt& receipt, TransferProgress& progress,
                   const std::atomic<bool>& stop)
    : options_(std::move(options)),
      receipt_(receipt),
      progress_(progress),
      stop_(stop),
      names_(receipt.names()) {}

void Importer::removeLeftovers() const {
  std::error_code error;
  for (const auto& entry : std::filesystem::directory_iterator(options_.folder, error)) {
    const std::string name = entry.path().filename();
    if (!name.starts_with(kPartPrefix) || !name.ends_with(kPartSuffix)) continue;
    // One that is locked belongs to an import that is still running.
    if (auto part = brivo::PartFile::open(entry.path()); part.ok()) (*part)->discard();
  }
}

void Importer::import(const orvid::Object& object) {
  if (!isFileName(object.info().name)) return failed(object.info(), "its name is no name for a file here");
  auto copied = std::make_shared<Copied>();
  copied->object = object.info();
  progress_.begin(object.info());
  const Failure failure = copy(object, *copied);
  progress_.end();
  if (!failure) return settleInBackground(std::move(copied));
  if (copied->part) copied->part->discard();
  if (!stop_) failed(object.info(), *failure);
}

Importer::Failure Importer::copy(const orvid::Object& object, Copied& copied) {
  auto part = brivo::PartFile::open(brivo::appendingPathComponent(options_.folder, partName(object.info())));
  if (!part.ok()) {
    return part.error().code == EWOULDBLOCK ? "it is being imported already" : part.error().text();
  }
  copied.part = *std::move(part);
  if (const auto error = copied.part->truncate(0)) return error->text();
  if (const auto error = copied.part->reserve(object.info().size)) return error->text();
  brivo::Sha256 digest;
  brivo::Sha256 headDigest;
  Failure failure;
  const auto read = object.stream(
      0,
      [&](std::span<const std::byte> piece) {
        const std::uint64_t before = copied.part->size();
        digesting_->post([&, piece, before] {
          if (before < ImportReceipt::kHeadSize) {
            headDigest.add(
                piece.first(std::min<std::uint64_t>(piece.size(), ImportReceipt::kHeadSize - before)));
          }
          digest.add(piece);
        });
        failure = textOf(copied.part->append(piece));
        digesting_->runAndWait([] {});  // the piece is gone after this
        progress_.reached(copied.part->size());
        return !failure && !stop_;
      },
      options_.timeout);
  if (failure) return failure;
  if (!read.ok()) return read.error().text;
  if (copied.part->size() != object.info().size) return "it is not whole";
  copied.head = headDigest.hexDigest();
  copied.sha256 = digest.hexDigest();
  return textOf(copied.part->setTimes({static_cast<std::int64_t>(object.info().modified), 0}));
}

// ------------------------------------------------------------------------------------------------- settling

void Importer::settleInBackground(std::shared_ptr<Copied> copied) {
  copied->part->startWriting();
  room_.acquire();
  settlers_.post([this, copied = std::move(copied)] {
    if (const Failure failure = settle(*copied)) {
      copied->part->discard();
      failed(copied->object, *failure);
    } else {
      succeeded(*copied);
    }
    room_.release();
  });
}

Importer::Failure Importer::settle(Copied& copied) {
  if (const auto error = copied.part->synchronize()) return error->text();
  if (options_.verify) {
    if (Failure failure = verify(copied)) return failure;
  }
  return publish(copied);
}

Importer::Failure Importer::verify(const Copied& copied) const {
  copied.part->dropFromCache();
  brivo::Sha256 digest;
  std::vector<std::byte> chunk(kChunk);
  for (std::uint64_t offset = 0; offset < copied.object.size;) {
    const auto count = copied.part->read(chunk, offset);
    if (!count.ok()) return count.error().text();
    if (*count == 0) break;
    digest.add(std::span(chunk).first(*count));
    offset += *count;
  }
  if (digest.hexDigest() != copied.sha256) return "what is on the disk is not what was read from the card";
  return std::nullopt;
}

Importer::Failure Importer::publish(Copied& copied) {
  for (int number = 0;; ++number) {
    copied.name = numberedName(copied.object.name, number);
    if (!claimName(copied.name)) continue;
    const std::string path = brivo::appendingPathComponent(options_.folder, copied.name);
    const auto error = copied.part->publishAsNew(path);
    if (!error) return std::nullopt;
    if (error->code != EEXIST) return error->text();
    if (!isSameFile(path, copied)) continue;
    copied.part->discard();  // an import got this far and no further
    return std::nullopt;
  }
}

bool Importer::claimName(const std::string& name) {
  const std::lock_guard lock(mutex_);
  return names_.insert(name).second;
}

bool Importer::isSameFile(const std::string& path, const Copied& copied) const {
  std::error_code error;
  if (!std::filesystem::is_regular_file(path, error)) return false;
  if (std::filesystem::file_size(path, error) != copied.object.size || error) return false;
  std::ifstream file(path, std::ios::binary);
  brivo::Sha256 digest;
  std::vector<char> chunk(kChunk);
  while (file) {
    file.read(chunk.data(), static_cast<std::streamsize>(chunk.size()));
    digest.add(std::as_bytes(std::span(chunk).first(static_cast<std::size_t>(file.gcount()))));
  }
  return file.eof() && digest.hexDigest() == copied.sha256;
}

// ------------------------------------------------------------------------------------------------ reporting

void Importer::succeeded(const Copied& copied) {
  const orvid::ObjectInfo& object = copied.object;
  const auto error = receipt_.append({copied.name, copied.sha256, options_.card, object.path, object.size,
                                      object.captured, object.modified, copied.head});
  if (error) return failed(object, "it was imported, but " + error->text());
  if (options_.json) {
    progress_.print({{"event", "imported"},
                     {"path", object.path},
                     {"file", brivo::appendingPathComponent(options_.folder, copied.name)},
                     {"size", object.size},
                     {"sha256", copied.sha256}});
  }
  const std::lock_guard lock(mutex_);
  ++outcome_.imported;
  outcome_.bytes += object.size;
}

void Importer::failed(const orvid::ObjectInfo& object, const std::string& why) {
  progress_.complain(shown(object.path) + ": " + shown(why));
  if (options_.json) progress_.print({{"event", "failed"}, {"path", object.path}, {"error", why}});
  const std::lock_guard lock(mutex_);
  ++outcome_.failed;
}

Importer::Outcome Importer::finish() {
  settlers_.waitUntilIdle();
  if (const auto error = receipt_.synchronize()) progress_.complain(error->text());
  const std::lock_guard lock(mutex_);
  outcome_.interrupted = stop_;
  return outcome_;
}

}  // namespace brivoctl
