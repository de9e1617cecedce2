// SPDX-License-Identifier: MIT
#pragma once

#include <atomic>
#include <cstdint>
#include <memory>
#include <mutex>
#include <semaphore>
#include <set>
#include <string>

#include "brivoctl/import_receipt.h"
#include "brivoctl/transfer_progress.h"
#include "platform/files/part_file.h"
#include "platform/work/pool.h"
#include "platform/work/serial_queue.h"

namespace brivoctl {

/// Imports objects into a folder, each in the same steps: bytes into a file of a temporary name, times, disk,
/// compared with what was read, its name, the receipt. While one file is on its way to the disk, the next is
/// copied. *Thread-bound*, but for what runs on its own threads.
class Importer {
 public:
  struct Options {
    std::string folder;
    std::string card;  ///< name of the device
    bool verify = true;
    bool json = false;
    orvid::Timeout timeout = orvid::kDefaultTimeout;
  };
  struct Outcome {
    std::uint64_t imported = 0;  ///< files
    std::uint64_t bytes = 0;
    std::uint64_t failed = 0;
    bool interrupted = false;
  };

  /// All must outlive this. `stop` becomes true when the user wants no more.
  Importer(Options options, ImportReceipt& receipt, TransferProgress& progress,
           const std::atomic<bool>& stop);

  /// Removes what interrupted imports have left in the folder.
  void removeLeftovers() const;
  /// Imports one object; an error is said and counted.
  void import(const orvid::Object& object);
  /// Waits for the files that are on their way to the disk.
  Outcome finish();

 private:
  struct Copied;
  using Failure = std::optional<std::string>;

  Failure copy(const orvid::Object& object, Copied& copied);
  Failure settle(Copied& copied);
  Failure verify(const Copied& copied) const;
  Failure publish(Copied& copied);
  /// False for the name of a file that was imported, now or ever.
  bool claimName(const std::string& name);
  bool isSameFile(const std::string& path, const Copied& copied) const;
  void settleInBackground(std::shared_ptr<Copied> copied);
  void succeeded(const Copied& copied);
  void failed(const orvid::ObjectInfo& object, const std::string& why);

  /// Files on their way to the disk: enough to keep it busy, few enough to be seen through quickly.
  static constexpr std::ptrdiff_t kMostUnsettled = 8;
  /// Most of them wait for the disk, which writes the journal once for those that wait together.
  static constexpr std::size_t kSettlers = 6;

  const Options options_;
  ImportReceipt& receipt_;
  TransferProgress& progress_;
  const std::atomic<bool>& stop_;

  std::mutex mutex_;
  Outcome outcome_;
  std::set<std::string> names_;
  std::counting_semaphore<kMostUnsettled> room_{kMostUnsettled};
  brivo::Pool digesters_{1};
  const std::shared_ptr<brivo::SerialQueue> digesting_ = brivo::SerialQueue::create(digesters_);
  brivo::Pool settlers_{kSettlers};  // last: uses everything above
};

}  // namespace brivoctl
