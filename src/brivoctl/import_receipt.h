// SPDX-License-Identifier: MIT
#pragma once

#include <functional>
#include <mutex>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "orvidcore/orvidcore.h"
#include "platform/base/result.h"
#include "platform/base/unique_fd.h"

namespace brivoctl {

/// What has been imported into a folder: a text file with a JSON object in each line, which is also what the
/// next import goes by. A line that is none (a torn one, after a power failure) is passed over.
/// *Thread-safe.*
class ImportReceipt {
 public:
  struct Entry {
    std::string name;    ///< of the file here
    std::string sha256;  ///< of its bytes
    std::string card;    ///< name of the device
    std::string path;    ///< on the card
    std::uint64_t size = 0;
    std::uint64_t captured = 0;
    std::uint64_t modified = 0;
    std::string head;  ///< SHA-256 of the first kHeadSize bytes
  };
  /// How much of a file's beginning tells it from others of its size and times, in bytes.
  static constexpr std::uint64_t kHeadSize = 65'536;
  /// Entry::head of an object, read from the card.
  using HeadOf = std::function<orvid::Result<std::string>(const orvid::Object&)>;

  /// Reads what is there, and creates the file when there is none.
  static brivo::Result<std::unique_ptr<ImportReceipt>> open(const std::string& path);
  ImportReceipt(const ImportReceipt&) = delete;
  ImportReceipt& operator=(const ImportReceipt&) = delete;

  /// Those of a card's objects that have not been imported. An entry stands for one object: the one with its
  /// path, else one that has been given another name since. An object whose head cannot be read counts as
  /// new.
  std::vector<orvid::Object> missing(const std::string& card, const std::vector<orvid::Object>& objects,
                                     const HeadOf& headOf) const;
  /// The names of all files that were imported.
  std::set<std::string> names() const;
  /// Adds a line. None, or why it could not be written.
  [[nodiscard]] std::optional<brivo::SystemError> append(const Entry& entry);
  /// Waits until all lines are on disk.
  [[nodiscard]] std::optional<brivo::SystemError> synchronize();

 private:
  ImportReceipt(std::string path, brivo::UniqueFd fd, std::vector<Entry> entries, bool torn)
      : path_(std::move(path)), fd_(std::move(fd)), entries_(std::move(entries)), torn_(torn) {}

  const std::string path_;
  const brivo::UniqueFd fd_;
  const std::vector<Entry> entries_;  // as of open()

  std::mutex mutex_;
  bool torn_;  // the last line has no end
};

}  // namespace brivoctl
