// SPDX-License-Identifier: Apache-2.0
#include "linux/ChildProcess.h"

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/eventfd.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>

#include "core/Files.h"
#include "core/Log.h"

namespace keepsakes {

namespace {

/// posix_spawn's two attribute objects, released together.
class SpawnSetup {
  public:
    explicit SpawnSetup(int output) {
        ::posix_spawn_file_actions_init(&actions_);
        ::posix_spawn_file_actions_addopen(&actions_, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
        ::posix_spawn_file_actions_adddup2(&actions_, output, STDOUT_FILENO);
        ::posix_spawn_file_actions_addclosefrom_np(&actions_, STDERR_FILENO + 1);
        ::posix_spawnattr_init(&attributes_);
        ::posix_spawnattr_setflags(
            &attributes_, POSIX_SPAWN_SETPGROUP | POSIX_SPAWN_SETSIGDEF | POSIX_SPAWN_SETSIGMASK);
        // The daemon blocks and ignores signals that the child shall die of, a broken pipe's first.
        sigset_t signals;
        ::sigemptyset(&signals);
        ::posix_spawnattr_setsigmask(&attributes_, &signals);
        ::sigfillset(&signals);
        ::posix_spawnattr_setsigdefault(&attributes_, &signals);
    }
    ~SpawnSetup() {
        ::posix_spawn_file_actions_destroy(&actions_);
        ::posix_spawnattr_destroy(&attributes_);
    }
    SpawnSetup(const SpawnSetup&) = delete;
    SpawnSetup& operator=(const SpawnSetup&) = delete;

    const posix_spawn_file_actions_t* actions() const { return &actions_; }
    const posix_spawnattr_t* attributes() const { return &attributes_; }

  private:
    posix_spawn_file_actions_t actions_{};
    posix_spawnattr_t attributes_{};
};

}  // namespace

std::expected<std::shared_ptr<ChildProcess>, KSError> ChildProcess::start(
    const std::vector<std::string>& arguments) {
    std::array<int, 2> ends{};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0) {
        return std::unexpected(posixError(errno, "make a pipe for", arguments.front()));
    }
    const int wake = ::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    if (wake < 0) {
        const int code = errno;
        ::close(ends[0]);
        ::close(ends[1]);
        return std::unexpected(posixError(code, "make an eventfd for", arguments.front()));
    }
    std::vector<char*> words;
    words.reserve(arguments.size() + 1);
    // NOLINTNEXTLINE(cppcoreguidelines-pro-type-const-cast): older than const; it does not write
    for (const auto& argument : arguments) words.push_back(const_cast<char*>(argument.c_str()));
    words.push_back(nullptr);
    const SpawnSetup setup(ends[1]);
    pid_t pid = -1;
    const int error = ::posix_spawn(&pid, words.front(), setup.actions(), setup.attributes(),
                                    words.data(), environ);
    ::close(ends[1]);
    if (error != 0) {
        ::close(ends[0]);
        ::close(wake);
        return std::unexpected(posixError(error, "start", arguments.front()));
    }
    ::fcntl(ends[0], F_SETFL, O_NONBLOCK);
    return std::shared_ptr<ChildProcess>(new ChildProcess(pid, ends[0], wake));
}

ChildProcess::ChildProcess(pid_t pid, int output, int wake)
    : pid_(pid),
      output_(output),
      wake_(wake),
      pidDescriptor_(static_cast<int>(::syscall(SYS_pidfd_open, pid, 0))) {
    if (pidDescriptor_ >= 0) ::fcntl(pidDescriptor_, F_SETFD, FD_CLOEXEC);
}

ChildProcess::~ChildProcess() {
    if (!reaped_) ::waitpid(pid_, nullptr, WNOHANG);
    ::close(output_);
    ::close(wake_);
    if (pidDescriptor_ >= 0) ::close(pidDescriptor_);
}

ChildEnd ChildProcess::run(const std::function<void(std::string_view)>& line) {
    ChildEnd ending;
    bool isOpen = true;
    for (;;) {
        const int limit = deliverSignal();
        std::array<pollfd, 3> watched{
            {{.fd = wake_, .events = POLLIN, .revents = 0},
             {.fd = isOpen ? output_ : -1, .events = POLLIN, .revents = 0},
             {.fd = pidDescriptor_, .events = POLLIN, .revents = 0}}};
        const int ready = ::poll(watched.data(), watched.size(), limit);
        if (ready < 0 && errno == EINTR) continue;
        if (ready == 0) {
            if (sent_ == SIGKILL) {
                logError("a killed child process does not end; it is left to itself");
                ending.abandoned = true;
                return ending;
            }
            end(SIGKILL);
            continue;
        }
        std::uint64_t drained = 0;
        if (watched[0].revents != 0) (void)!::read(wake_, &drained, sizeof(drained));
        if (watched[1].revents != 0) isOpen = readOutput(line);
        // On kernels without process descriptors the end of the output is taken for the end.
        const bool mayHaveEnded = pidDescriptor_ >= 0 ? watched[2].revents != 0 : !isOpen;
        if (mayHaveEnded && reap(ending)) {
            if (isOpen) readOutput(line);
            return ending;
        }
    }
}

void ChildProcess::end(int signal) {
    const std::lock_guard held(mutex_);
    if (wanted_ != SIGKILL) wanted_ = signal;
    const std::uint64_t one = 1;
    (void)!::write(wake_, &one, sizeof(one));
}

int ChildProcess::deliverSignal() {
    const std::lock_guard held(mutex_);
    if (wanted_ == 0) return -1;
    if (wanted_ != sent_ && !reaped_) {
        ::kill(-pid_, wanted_);
        sent_ = wanted_;
        sentAt_ = std::chrono::steady_clock::now();
    }
    const auto since = std::chrono::duration_cast<std::chrono::milliseconds>(
        std::chrono::steady_clock::now() - sentAt_);
    return std::max(0, kGraceMilliseconds - static_cast<int>(since.count()));
}

bool ChildProcess::reap(ChildEnd& ending) {
    int status = 0;
    pid_t found = 0;
    do {
        found = ::waitpid(pid_, &status, pidDescriptor_ >= 0 ? WNOHANG : 0);
    } while (found < 0 && errno == EINTR);
    if (found == 0) return false;
    const std::lock_guard held(mutex_);
    reaped_ = true;
    ending.exited = found == pid_ && WIFEXITED(status);
    if (ending.exited) ending.status = WEXITSTATUS(status);
    if (found == pid_ && WIFSIGNALED(status)) ending.signal = WTERMSIG(status);
    return true;
}

/// Whether there may be more.
bool ChildProcess::readOutput(const std::function<void(std::string_view)>& line) {
    std::array<char, 16384> block{};
    for (;;) {
        const auto count = ::read(output_, block.data(), block.size());
        if (count < 0) return errno == EAGAIN || errno == EINTR;
        if (count == 0) return false;
        std::string_view text(block.data(), static_cast<std::size_t>(count));
        for (auto end = text.find('\n'); end != std::string_view::npos; end = text.find('\n')) {
            if (!isDropping_ && partial_.size() + end <= kLongestLine) {
                partial_ += text.substr(0, end);
                line(partial_);
            }
            partial_.clear();
            isDropping_ = false;
            text.remove_prefix(end + 1);
        }
        if (partial_.size() + text.size() > kLongestLine) isDropping_ = true;
        if (isDropping_) {
            partial_.clear();
        } else {
            partial_ += text;
        }
    }
}

}  // namespace keepsakes
