// SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <cstdint>
#include <future>
#include <optional>

#include "orvidcore/lent_buffers.h"
#include "orvidcore/object.h"
#include "orvidcore/session.h"

namespace orvid {

/// Asks for a range of an object. The data is never longer than `length`.
void requestRange(Session& session, std::uint32_t handle, std::uint64_t offset, std::uint64_t length,
                  Timeout timeout, Callback<Data> handler);

/// The bytes of one object in order, by the fastest way that works: into memory that is lent to the service,
/// the next piece under way while one is used; else read ahead by the service; else range by range.
/// *Thread-bound.*
class PieceStream {
 public:
  PieceStream(Session& session, const ObjectInfo& object, Timeout timeout)
      : session_(session), object_(object), timeout_(timeout) {}

  /// Hands the pieces from `offset` to the object's end to `handler`, blocking. Done when the handler said
  /// stop, and when it has had all bytes; fewer are an error.
  Result<Done> run(std::uint64_t offset, const Object::PieceHandler& handler);

 private:
  /// A read into a lent buffer that has not been answered yet.
  struct Underway {
    std::optional<LentBuffer> buffer;
    std::future<Result<Dictionary>> answer;
    std::uint64_t length = 0;
  };

  // Each goes on from offset_ as far as it can.
  Result<Done> throughLentBuffers(const Object::PieceHandler& handler);
  Result<Done> throughReadAhead(const Object::PieceHandler& handler);
  Result<Done> throughRanges(const Object::PieceHandler& handler);

  bool done() const { return stopped_ || offset_ == object_.size; }
  void deliver(std::span<const std::byte> piece, const Object::PieceHandler& handler);
  Result<Data> range();
  Result<Done> control(std::string_view key, const std::optional<LentBuffer>& buffer = std::nullopt);
  /// Asks for the piece at `offset` into the buffer of `read`.
  void ask(Underway& read, std::uint64_t offset);
  /// What the answer of `read` put into its buffer: a count of bytes, none when the service takes no buffers.
  Result<std::optional<std::uint64_t>> finish(Underway& read);
  void giveBack(std::array<Underway, 2>& reads);

  Session& session_;
  const ObjectInfo& object_;
  const Timeout timeout_;
  std::uint64_t offset_ = 0;
  bool stopped_ = false;
};

}  // namespace orvid
