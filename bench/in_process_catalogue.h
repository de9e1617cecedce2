// SPDX-License-Identifier: MIT
#pragma once

#include <memory>

#include "card.h"
#include "catalogue_recorder.h"
#include "device/brivo_device.h"
#include "imaging/local_image_decoder.h"
#include "imaging/local_movie_reader.h"
#include "platform/zeph/connection_service.h"

namespace brivo::bench {

/// Catalogues of cards made by devices in this process, for a client that only counts what it is sent: the
/// service without the wire. Log lines are written to a file, as those of the service process are.
class InProcessCatalogue {
 public:
  InProcessCatalogue();
  ~InProcessCatalogue();

  /// Milliseconds from the enumerate call on a fresh device to the last object that is sent.
  double enumerate(const Card& card);

 private:
  class NoPower final : public PowerAssertions {
   public:
    Handle create(const std::string&, std::chrono::seconds) override { return nullptr; }
  };

  DeviceServices services();

  const test::TemporaryFolder runtime_;
  Pool pool_;
  zeph::ConnectionService connections_{pool_, nullptr};
  std::unique_ptr<zeph::RuntimeFolder> folder_;
  NoPower power_;
  LocalImageDecoder images_;
  LocalMovieReader movieReader_;
  MovieService movies_{movieReader_, 1, 1};
};

}  // namespace brivo::bench
