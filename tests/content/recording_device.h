// SPDX-License-Identifier: MIT
// A device that keeps what items tell it, for tests of items on real files.
#pragma once

#include <algorithm>
#include <mutex>
#include <string>
#include <vector>

#include "content/brivo_folder.h"
#include "content/camera_device.h"
#include "content/media/brivo_file.h"
#include "imaging/local_image_decoder.h"
#include "imaging/local_movie_reader.h"
#include "io/read_memory.h"
#include "platform/movies/movie_service.h"
#include "platform/work/pool.h"
#include "ptp/object_info_dataset.h"

namespace brivo {

class RecordingDevice : public CameraDevice {
 public:
  std::string name() const override { return "CARD"; }
  bool isLocked() const override { return locked; }
  bool prioritizeSpeed() const override { return speedFirst; }
  bool beingEjected() const override { return ejected; }
  FileSystem& files() const override { return *fileSystem; }

  void addCameraFileToIndex(const std::shared_ptr<BrivoItem>& item) override {
    const std::lock_guard lock(mutex);
    files_.push_back(std::static_pointer_cast<BrivoFile>(item));
  }
  void addCameraFolderToIndex(const std::shared_ptr<BrivoItem>& item) override {
    const std::lock_guard lock(mutex);
    folders.push_back(std::static_pointer_cast<BrivoFolder>(item));
  }
  void flushNotifications(Array datasets) override {
    const std::lock_guard lock(mutex);
    batches.push_back(std::move(datasets));
  }
  std::shared_ptr<BrivoItem> cameraItemWithObjectID(std::uint64_t handle) const override {
    const auto found =
        std::ranges::find(folders, handle, [](const auto& folder) { return folder->objHandle(); });
    return found == folders.end() ? nullptr : *found;
  }
  MetadataArchive& metadataArchive() override { return archive; }
  ReadMemory& readMemory() override { return memory; }
  ImageDecoder& imageDecoder() const override { return decoder; }
  MovieService& movies() const override { return movieService; }
  std::shared_ptr<SerialQueue> makeSerialQueue() override { return SerialQueue::create(pool); }
  void addInitiatedOperation(Task operation) override { operations.push_back(std::move(operation)); }
  /// Steps run in order on the test's thread, in run().
  void enumerateConcurrently(Task step) override { steps.push_back(std::move(step)); }
  void enumerateWhenClientsKeepUp(Task step) override { steps.push_back(std::move(step)); }

  /// Runs steps until there are none left.
  void run() {
    while (!steps.empty()) {
      const Task step = std::move(steps.front());
      steps.erase(steps.begin());
      step();
    }
  }

  /// The names in each batch, in the order of sending.
  std::vector<std::vector<std::string>> batchNames() {
    std::vector<std::vector<std::string>> names;
    for (const Array& batch : batches) {
      names.emplace_back();
      for (const Value& dataset : batch) {
        names.back().push_back(MSObjectInfoDataset(*dataset.get<Data>()).filename());
      }
    }
    return names;
  }

  bool locked = false;
  bool ejected = false;
  bool speedFirst = false;
  FileSystem* fileSystem = &systemFiles();
  Pool pool;
  std::mutex mutex;
  std::vector<std::shared_ptr<BrivoFile>> files_;
  std::vector<std::shared_ptr<BrivoFolder>> folders;
  std::vector<Array> batches;
  std::vector<Task> steps;
  /// What items have asked to be done later.
  std::vector<Task> operations;
  MetadataArchive archive;
  ReadMemory memory{4'194'304};
  mutable LocalImageDecoder decoder;
  LocalMovieReader movieReader;
  mutable MovieService movieService{movieReader, 1, 1};
};

}  // namespace brivo
