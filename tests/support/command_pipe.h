// SPDX-License-Identifier: MIT
#pragma once

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <array>
#include <string_view>

#include "platform/base/unique_fd.h"

namespace brivo::test {

/// A command for a probing worker in a pipe: it shows when a worker has taken it.
class CommandPipe {
 public:
  explicit CommandPipe(std::string_view command) {
    std::array<int, 2> ends{};
    EXPECT_EQ(::pipe2(ends.data(), O_CLOEXEC), 0);
    reader_.reset(ends[0]);
    writer_.reset(ends[1]);
    EXPECT_EQ(::write(writer_.get(), command.data(), command.size()), static_cast<ssize_t>(command.size()));
  }

  const UniqueFd& file() const { return reader_; }
  bool isTaken() const {
    int left = -1;
    return ::ioctl(reader_.get(), FIONREAD, &left) == 0 && left == 0;
  }

 private:
  UniqueFd reader_;
  UniqueFd writer_;
};

}  // namespace brivo::test
