// SPDX-License-Identifier: Apache-2.0
#include "indexer/Sandbox.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <linux/landlock.h>
#include <seccomp.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <system_error>

#include "core/Log.h"

namespace keepsakes {

namespace {

// The sanitizers map terabytes and start threads of their own.
#ifdef KEEPSAKES_SANITIZED
constexpr bool kCanConfine = false;
#else
constexpr bool kCanConfine = true;
#endif

std::string textOf(int error) { return std::generic_category().message(error); }

void limit(decltype(RLIMIT_DATA) resource, std::uint64_t most, const char* what) {
    rlimit current{};
    ::getrlimit(resource, &current);
    if (current.rlim_max < most) most = current.rlim_max;
    const rlimit wanted{.rlim_cur = most, .rlim_max = most};
    if (::setrlimit(resource, &wanted) != 0) {
        logWarning(fmt::format("no limit of {}: {}", what, textOf(errno)));
    }
}

constexpr std::uint64_t kReading = LANDLOCK_ACCESS_FS_READ_FILE | LANDLOCK_ACCESS_FS_READ_DIR;
constexpr std::uint64_t kWriting = kReading | LANDLOCK_ACCESS_FS_WRITE_FILE |
                                   LANDLOCK_ACCESS_FS_REMOVE_FILE | LANDLOCK_ACCESS_FS_MAKE_REG;
/// Every access that landlock's first version knows.
constexpr std::uint64_t kEverything = (LANDLOCK_ACCESS_FS_MAKE_SYM << 1) - 1;

void allow(int ruleset, const std::filesystem::path& path, std::uint64_t access) {
    const int fd = ::open(path.c_str(), O_PATH | O_CLOEXEC);
    if (fd < 0) return;  // What is not there need not be allowed.
    struct stat info {};
    if (::fstat(fd, &info) == 0 && !S_ISDIR(info.st_mode)) {
        access &= ~std::uint64_t{LANDLOCK_ACCESS_FS_READ_DIR};
    }
    const landlock_path_beneath_attr rule{.allowed_access = access, .parent_fd = fd};
    if (::syscall(SYS_landlock_add_rule, ruleset, LANDLOCK_RULE_PATH_BENEATH, &rule, 0) != 0) {
        logWarning(fmt::format("landlock does not take {}: {}", path.string(), textOf(errno)));
    }
    ::close(fd);
}

void confineFiles(const std::vector<std::filesystem::path>& readable,
                  const std::vector<std::filesystem::path>& writable) {
    const landlock_ruleset_attr attributes{.handled_access_fs = kEverything};
    const auto made = ::syscall(SYS_landlock_create_ruleset, &attributes, sizeof(attributes), 0);
    if (made < 0) {
        logInfo(fmt::format("the indexer runs without landlock: {}", textOf(errno)));
        return;
    }
    const int ruleset = static_cast<int>(made);
    for (const auto& path : readable) allow(ruleset, path, kReading);
    for (const auto& path : writable) allow(ruleset, path, kWriting);
    // The owner's zone, and what database and hash take randomness from.
    for (const char* path : {"/etc/localtime", "/etc/timezone", "/usr/share/zoneinfo",
                             "/usr/share/icu", "/dev/urandom"}) {
        allow(ruleset, path, kReading);
    }
    if (::syscall(SYS_landlock_restrict_self, ruleset, 0) != 0) {
        logInfo(fmt::format("the indexer runs without landlock: {}", textOf(errno)));
    }
    ::close(ruleset);
}

void confineCalls() {
    // What is not named fails with EPERM rather than ending the process: a library that merely
    // asks for more than it needs then goes on.
    static constexpr auto kAllowed = std::to_array<int>({
        SCMP_SYS(read),
        SCMP_SYS(pread64),
        SCMP_SYS(readv),
        SCMP_SYS(preadv),
        SCMP_SYS(write),
        SCMP_SYS(pwrite64),
        SCMP_SYS(writev),
        SCMP_SYS(pwritev),
        SCMP_SYS(open),
        SCMP_SYS(openat),
        SCMP_SYS(close),
        SCMP_SYS(lseek),
        SCMP_SYS(_llseek),
        SCMP_SYS(fstat),
        SCMP_SYS(fstat64),
        SCMP_SYS(stat),
        SCMP_SYS(stat64),
        SCMP_SYS(lstat),
        SCMP_SYS(lstat64),
        SCMP_SYS(newfstatat),
        SCMP_SYS(fstatat64),
        SCMP_SYS(statx),
        SCMP_SYS(statfs),
        SCMP_SYS(fstatfs),
        SCMP_SYS(access),
        SCMP_SYS(faccessat),
        SCMP_SYS(faccessat2),
        SCMP_SYS(getdents),
        SCMP_SYS(getdents64),
        SCMP_SYS(readlink),
        SCMP_SYS(readlinkat),
        SCMP_SYS(getcwd),
        SCMP_SYS(fcntl),
        SCMP_SYS(fcntl64),
        SCMP_SYS(flock),
        SCMP_SYS(fsync),
        SCMP_SYS(fdatasync),
        SCMP_SYS(ftruncate),
        SCMP_SYS(ftruncate64),
        SCMP_SYS(fallocate),
        SCMP_SYS(fadvise64),
        SCMP_SYS(unlink),
        SCMP_SYS(unlinkat),
        SCMP_SYS(rename),
        SCMP_SYS(renameat),
        SCMP_SYS(fchmod),
        SCMP_SYS(fchown),
        SCMP_SYS(umask),
        SCMP_SYS(dup),
        SCMP_SYS(ioctl),
        SCMP_SYS(poll),
        SCMP_SYS(ppoll),
        SCMP_SYS(mmap),
        SCMP_SYS(mmap2),
        SCMP_SYS(munmap),
        SCMP_SYS(mremap),
        SCMP_SYS(mprotect),
        SCMP_SYS(madvise),
        SCMP_SYS(brk),
        SCMP_SYS(msync),
        SCMP_SYS(futex),
        SCMP_SYS(sched_yield),
        SCMP_SYS(sched_getaffinity),
        SCMP_SYS(clock_gettime),
        SCMP_SYS(clock_gettime64),
        SCMP_SYS(clock_getres),
        SCMP_SYS(clock_nanosleep),
        SCMP_SYS(nanosleep),
        SCMP_SYS(gettimeofday),
        SCMP_SYS(time),
        SCMP_SYS(alarm),
        SCMP_SYS(setitimer),
        SCMP_SYS(rt_sigaction),
        SCMP_SYS(rt_sigprocmask),
        SCMP_SYS(rt_sigreturn),
        SCMP_SYS(sigreturn),
        SCMP_SYS(sigaltstack),
        SCMP_SYS(restart_syscall),
        SCMP_SYS(getpid),
        SCMP_SYS(gettid),
        SCMP_SYS(getuid),
        SCMP_SYS(geteuid),
        SCMP_SYS(getgid),
        SCMP_SYS(getegid),
        SCMP_SYS(getrandom),
        SCMP_SYS(sysinfo),
        SCMP_SYS(uname),
        SCMP_SYS(getrlimit),
        SCMP_SYS(getrusage),
        SCMP_SYS(exit),
        SCMP_SYS(exit_group),
    });
    scmp_filter_ctx filter = seccomp_init(SCMP_ACT_ERRNO(EPERM));
    if (!filter) {
        logInfo("the indexer runs without seccomp: no memory for its filter");
        return;
    }
    int failed = 0;
    // A call that this architecture does not have is refused by the library, and not missed.
    for (const int call : kAllowed) (void)!seccomp_rule_add(filter, SCMP_ACT_ALLOW, call, 0);
    // To itself alone: `abort` and `raise` end a process that is broken.
    const auto self = static_cast<scmp_datum_t>(::getpid());
    const scmp_arg_cmp itself{.arg = 0, .op = SCMP_CMP_EQ, .datum_a = self, .datum_b = 0};
    // Asking for limits, not setting them.
    const scmp_arg_cmp nothing{.arg = 2, .op = SCMP_CMP_EQ, .datum_a = 0, .datum_b = 0};
    for (const auto& [call, argument] :
         {std::pair(SCMP_SYS(kill), itself), std::pair(SCMP_SYS(tgkill), itself),
          std::pair(SCMP_SYS(prlimit64), nothing)}) {
        if (failed == 0) {
            failed = seccomp_rule_add_array(filter, SCMP_ACT_ALLOW, call, 1, &argument);
        }
    }
    if (failed == 0) failed = seccomp_load(filter);
    seccomp_release(filter);
    if (failed != 0) {
        logInfo(fmt::format("the indexer runs without seccomp: {}", textOf(-failed)));
    }
}

}  // namespace

void confineProcess(const std::vector<std::filesystem::path>& readable,
                    const std::vector<std::filesystem::path>& writable) {
    if (!kCanConfine) {
        logInfo("built with a sanitizer: the indexer runs without limits");
        return;
    }
    limit(RLIMIT_DATA, kMemoryLimit, "memory");
    limit(RLIMIT_AS, kAddressSpaceLimit, "address space");
    limit(RLIMIT_CORE, 0, "core files");
    if (::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) != 0) {
        logWarning(fmt::format("the indexer may gain privileges: {}", textOf(errno)));
    }
    confineFiles(readable, writable);
    confineCalls();
}

}  // namespace keepsakes
