// SPDX-License-Identifier: MIT
#include "orvidcore/piece_stream.h"

#include <algorithm>

#include "protocol/keys.h"
#include "protocol/selectors.h"

namespace orvid {

namespace keys = brivo::keys;
namespace selectors = brivo::selectors;

namespace {

constexpr std::uint64_t kPieceSize = LentBuffers::kSize;

Dictionary rangeOptions(std::uint64_t offset, std::uint64_t length) {
  Dictionary options;
  options.set(keys::kReadOffset, offset);
  options.set(keys::kReadLength, length);
  return options;
}

}  // namespace

void requestRange(Session& session, std::uint32_t handle, std::uint64_t offset, std::uint64_t length,
                  Timeout timeout, Callback<Data> handler) {
  session.request(selectors::kRequestReadData, handle, rangeOptions(offset, length), timeout,
                  [length, handler = std::move(handler)](const Result<Dictionary>& result) {
                    if (!result.ok()) return handler(result.error());
                    const Data* data = result->data(keys::kReadData);
                    handler(data ? data->first(length) : Data());
                  });
}

Result<Done> PieceStream::run(std::uint64_t offset, const Object::PieceHandler& handler) {
  offset_ = offset;
  for (const auto way :
       {&PieceStream::throughLentBuffers, &PieceStream::throughReadAhead, &PieceStream::throughRanges}) {
    if (done()) return Done();
    if (auto result = (this->*way)(handler); !result.ok()) return result;
  }
  if (done()) return Done();
  return Error{ErrorKind::disconnected, 0, "the medium gave no more bytes of " + object_.path};
}

void PieceStream::deliver(std::span<const std::byte> piece, const Object::PieceHandler& handler) {
  offset_ += piece.size();
  stopped_ = !handler(piece);
}

Result<Done> PieceStream::control(std::string_view key, const std::optional<LentBuffer>& buffer) {
  Dictionary options;
  options.set(key, true);
  if (buffer) options.set(keys::kReadBuffer, buffer->shared);
  const auto result = blocking<Dictionary>([&](auto handler) {
    session_.request(selectors::kRequestReadData, object_.handle, std::move(options), timeout_,
                     std::move(handler));
  });
  return result.ok() ? Result<Done>(Done()) : result.error();
}

// --------------------------------------------------------------------------------------------- lent buffers

Result<Done> PieceStream::throughLentBuffers(const Object::PieceHandler& handler) {
  std::array<Underway, 2> reads;
  for (Underway& read : reads) read.buffer = session_.lentBuffers().take();
  if (!reads[0].buffer || !reads[1].buffer) return Done();
  if (auto opened = control(keys::kReadBufferStreamOpen, reads[0].buffer); !opened.ok()) {
    return opened.error().kind == ErrorKind::malformed ? Done() : opened;  // it takes no buffers
  }
  Result<Done> result = Done();
  std::uint64_t asked = offset_;
  const auto askNext = [&](Underway& read) {
    if (asked == object_.size) return;
    ask(read, asked);
    asked += read.length;
  };
  for (Underway& read : reads) askNext(read);
  for (std::size_t turn = 0; !done() && result.ok(); turn = 1 - turn) {
    Underway& read = reads[turn];
    const auto count = finish(read);
    if (!count.ok()) result = count.error();
    if (!count.ok() || count->value_or(0) == 0) break;
    deliver(read.buffer->mapping.bytes().first(**count), handler);
    if (**count < read.length) {  // what was asked for next lies behind a gap
      if (const auto skipped = finish(reads[1 - turn]); !skipped.ok()) {
        result = skipped.error();
        break;
      }
      asked = offset_;
      askNext(reads[1 - turn]);
    }
    askNext(read);
  }
  giveBack(reads);
  const auto closed = control(keys::kReadBufferStreamClose);
  return result.ok() && !done() ? closed : result;
}

void PieceStream::ask(Underway& read, std::uint64_t offset) {
  read.length = std::min(kPieceSize, object_.size - offset);
  Dictionary options = rangeOptions(offset, read.length);
  options.set(keys::kReadBuffer, read.buffer->shared);
  auto promise = std::make_shared<std::promise<Result<Dictionary>>>();
  read.answer = promise->get_future();
  session_.request(selectors::kRequestReadData, object_.handle, std::move(options), timeout_,
                   [promise](Result<Dictionary> result) { promise->set_value(std::move(result)); });
}

Result<std::optional<std::uint64_t>> PieceStream::finish(Underway& read) {
  if (!read.answer.valid()) return std::optional<std::uint64_t>(0);
  const auto result = read.answer.get();
  if (!result.ok()) {
    read.buffer.reset();  // a late answer may still be written into it
    return result.error();
  }
  const auto count = result->unsignedInteger(keys::kReadBufferCount);
  if (count && *count > read.length) return Error{ErrorKind::malformed, 0, "more bytes than were asked for"};
  return count;
}

void PieceStream::giveBack(std::array<Underway, 2>& reads) {
  for (Underway& read : reads) {
    (void)finish(read);
    if (read.buffer) session_.lentBuffers().giveBack(*std::move(read.buffer));
  }
}

// ------------------------------------------------------------------------------------------- without buffers

Result<Done> PieceStream::throughReadAhead(const Object::PieceHandler& handler) {
  if (offset_ != 0) return Done();  // it begins at the beginning
  if (auto opened = control(keys::kReadBufferStreamOpen); !opened.ok()) return opened;
  auto result = throughRanges(handler);
  const auto closed = control(keys::kReadBufferStreamClose);
  return result.ok() && !done() ? closed : result;
}

Result<Done> PieceStream::throughRanges(const Object::PieceHandler& handler) {
  while (!done()) {
    const auto piece = range();
    if (!piece.ok()) return piece.error();
    if (piece->empty()) break;
    deliver(piece->bytes(), handler);
  }
  return Done();
}

Result<Data> PieceStream::range() {
  return blocking<Data>([&](auto handler) {
    requestRange(session_, object_.handle, offset_, std::min(kPieceSize, object_.size - offset_), timeout_,
                 std::move(handler));
  });
}

}  // namespace orvid
