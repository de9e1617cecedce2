// SPDX-License-Identifier: MIT
#include "imaging/system_calls.h"

#include <fcntl.h>
#include <seccomp.h>
#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <initializer_list>
#include <memory>

#include "platform/decoding/sanitized_build.h"

namespace brivo::imaging {

namespace {

/// Results are written with pwrite64, and file sizes are read from descriptors: see kConditional too.
constexpr int kAllowed[] = {
    SCMP_SYS(brk),        SCMP_SYS(clock_gettime),   SCMP_SYS(close),          SCMP_SYS(exit),
    SCMP_SYS(exit_group), SCMP_SYS(fstat),           SCMP_SYS(ftruncate),      SCMP_SYS(futex),
    SCMP_SYS(getrandom),  SCMP_SYS(lseek),           SCMP_SYS(madvise),        SCMP_SYS(mremap),
    SCMP_SYS(munmap),     SCMP_SYS(pread64),         SCMP_SYS(pwrite64),       SCMP_SYS(read),
    SCMP_SYS(recvmsg),    SCMP_SYS(restart_syscall), SCMP_SYS(rt_sigprocmask), SCMP_SYS(rt_sigreturn),
    SCMP_SYS(sendmsg)};

/// A library's probe costs nothing.
constexpr int kRefused[] = {
    // files
    SCMP_SYS(access), SCMP_SYS(creat), SCMP_SYS(faccessat), SCMP_SYS(faccessat2), SCMP_SYS(getcwd),
    SCMP_SYS(getdents64), SCMP_SYS(lstat), SCMP_SYS(memfd_create), SCMP_SYS(mkdir), SCMP_SYS(mkdirat),
    SCMP_SYS(open), SCMP_SYS(openat), SCMP_SYS(openat2), SCMP_SYS(readlink), SCMP_SYS(readlinkat),
    SCMP_SYS(rename), SCMP_SYS(renameat), SCMP_SYS(renameat2), SCMP_SYS(stat), SCMP_SYS(statfs),
    SCMP_SYS(statx), SCMP_SYS(unlink), SCMP_SYS(unlinkat),
    // descriptors
    SCMP_SYS(dup), SCMP_SYS(dup2), SCMP_SYS(dup3), SCMP_SYS(eventfd2), SCMP_SYS(fcntl), SCMP_SYS(fstatfs),
    SCMP_SYS(ioctl), SCMP_SYS(pipe), SCMP_SYS(pipe2), SCMP_SYS(poll), SCMP_SYS(ppoll),
    // sockets
    SCMP_SYS(bind), SCMP_SYS(connect), SCMP_SYS(recvfrom), SCMP_SYS(sendto), SCMP_SYS(socket),
    SCMP_SYS(socketpair),
    // programs, processes and threads
    SCMP_SYS(clone), SCMP_SYS(clone3), SCMP_SYS(execve), SCMP_SYS(execveat), SCMP_SYS(fork), SCMP_SYS(vfork),
    SCMP_SYS(getegid), SCMP_SYS(geteuid), SCMP_SYS(getgid), SCMP_SYS(getpid), SCMP_SYS(getppid),
    SCMP_SYS(gettid), SCMP_SYS(getuid), SCMP_SYS(prctl), SCMP_SYS(rt_sigaction), SCMP_SYS(sigaltstack),
    // the machine and its resources
    SCMP_SYS(clock_getres), SCMP_SYS(clock_nanosleep), SCMP_SYS(getcpu), SCMP_SYS(getrlimit),
    SCMP_SYS(getrusage), SCMP_SYS(membarrier), SCMP_SYS(mlock), SCMP_SYS(nanosleep), SCMP_SYS(prlimit64),
    SCMP_SYS(sched_getaffinity), SCMP_SYS(sched_setaffinity), SCMP_SYS(sched_yield), SCMP_SYS(setpriority),
    SCMP_SYS(setrlimit), SCMP_SYS(sysinfo), SCMP_SYS(times), SCMP_SYS(uname)};

/// What the sanitizers' runtimes do besides: on a thread of their own, when they look whether memory can be
/// read (with a pipe), and when they report.
constexpr int kAllowedForSanitizers[] = {SCMP_SYS(clock_nanosleep),
                                         SCMP_SYS(getpid),
                                         SCMP_SYS(gettid),
                                         SCMP_SYS(nanosleep),
                                         SCMP_SYS(pipe),
                                         SCMP_SYS(pipe2),
                                         SCMP_SYS(rt_sigaction),
                                         SCMP_SYS(sched_yield),
                                         SCMP_SYS(sigaltstack),
                                         SCMP_SYS(write)};

bool isForSanitizers(int call) {
  return kSanitizedBuild && std::ranges::find(kAllowedForSanitizers, call) != std::end(kAllowedForSanitizers);
}

using Condition = scmp_arg_cmp;

/// Calls whose arguments decide: allowed where `condition` holds, refused where `otherwise` does, which is
/// its opposite.
struct Conditional {
  int call;
  Condition condition;
  Condition otherwise;
};

constexpr Condition bitIs(unsigned argument, std::uint64_t bit, bool set) {
  return {argument, SCMP_CMP_MASKED_EQ, bit, set ? bit : 0};
}
constexpr Condition atMost(unsigned argument, std::uint64_t value) {
  return {argument, SCMP_CMP_LE, value, 0};
}
constexpr Condition above(unsigned argument, std::uint64_t value) {
  return {argument, SCMP_CMP_GT, value, 0};
}

constexpr Conditional kConditional[] = {
    // No code but what was loaded. A library that would make some goes another way.
    {SCMP_SYS(mmap), bitIs(2, PROT_EXEC, false), bitIs(2, PROT_EXEC, true)},
    {SCMP_SYS(mprotect), bitIs(2, PROT_EXEC, false), bitIs(2, PROT_EXEC, true)},
    // How the C library reads the status of a descriptor.
    {SCMP_SYS(newfstatat), bitIs(3, AT_EMPTY_PATH, true), bitIs(3, AT_EMPTY_PATH, false)},
    // Messages of libraries, which are for the log.
    {SCMP_SYS(write), atMost(0, STDERR_FILENO), above(0, STDERR_FILENO)},
    {SCMP_SYS(writev), atMost(0, STDERR_FILENO), above(0, STDERR_FILENO)}};

/// Rules in the making. After the first error nothing more is added. *Thread-bound.*
class Filter {
 public:
  Filter() : context_(::seccomp_init(SCMP_ACT_KILL_PROCESS)) {
    if (!context_) error_ = ENOMEM;
    set(SCMP_FLTATR_ACT_BADARCH, SCMP_ACT_KILL_PROCESS);
    set(SCMP_FLTATR_CTL_TSYNC, 1);
  }

  void add(std::uint32_t action, int call, std::initializer_list<Condition> conditions = {}) {
    if (error_ != 0) return;
    error_ = -::seccomp_rule_add_array(context_.get(), action, call, static_cast<unsigned>(conditions.size()),
                                       conditions.begin());
  }

  /// 0, or an error number.
  int load() { return error_ != 0 ? error_ : -::seccomp_load(context_.get()); }

 private:
  struct Release {
    void operator()(void* context) const { ::seccomp_release(context); }
  };

  void set(scmp_filter_attr attribute, std::uint32_t value) {
    if (error_ == 0) error_ = -::seccomp_attr_set(context_.get(), attribute, value);
  }

  std::unique_ptr<void, Release> context_;
  int error_ = 0;
};

}  // namespace

std::optional<SystemError> restrictSystemCalls() {
  constexpr std::uint32_t refuse = SCMP_ACT_ERRNO(EPERM);
  Filter filter;
  for (const int call : kAllowed) filter.add(SCMP_ACT_ALLOW, call);
  const auto otherwise = [](int call) { return isForSanitizers(call) ? SCMP_ACT_ALLOW : refuse; };
  for (const int call : kRefused) filter.add(otherwise(call), call);
  for (const Conditional& rule : kConditional) {
    filter.add(SCMP_ACT_ALLOW, rule.call, {rule.condition});
    filter.add(otherwise(rule.call), rule.call, {rule.otherwise});
  }
  const int error = filter.load();
  if (error != 0) return SystemError{"restrict system calls", error};
  return std::nullopt;
}

}  // namespace brivo::imaging
